#include "replace_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"

namespace SecPolicyCli {

void ReplaceFile(const std::string& path, const std::string& text) {
  constexpr mode_t kForAll = 0644;
  constexpr char kCannotWrite[] = "cannot write ";
  const std::filesystem::path wanted = path;
  // Collectors pass over a name without their ending.
  std::string name = wanted.parent_path() / ("." + wanted.filename().string() + ".XXXXXX");
  const LinuxHost::Descriptor file(mkostemp(name.data(), O_CLOEXEC));
  if (!file.IsOpen()) LinuxHost::ThrowErrno(kCannotWrite, path);
  if (LinuxHost::WriteAll(file.Number(), text) && fchmod(file.Number(), kForAll) == 0 &&
      rename(name.c_str(), path.c_str()) == 0) {
    return;
  }
  const int error = errno;
  unlink(name.c_str());
  errno = error;
  LinuxHost::ThrowErrno(kCannotWrite, path);
}

}  // namespace SecPolicyCli
