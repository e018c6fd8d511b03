#include "begin/new_file.h"

#include <fcntl.h>
#include <unistd.h>

#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"

namespace SecPolicyCli {

void WriteNewFile(const std::filesystem::path& path, const std::string& text) {
  const LinuxHost::Descriptor file(
      open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0644));
  if (!file.IsOpen()) LinuxHost::ThrowErrno("cannot make ", path.native());
  if (!LinuxHost::WriteAll(file.Number(), text)) {
    LinuxHost::ThrowErrno("cannot write ", path.native());
  }
}

}  // namespace SecPolicyCli
