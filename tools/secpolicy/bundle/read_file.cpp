#include "bundle/read_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>

#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "refusal.h"

namespace SecPolicyCli {

FileContent ReadFile(const std::string& path, std::size_t most) {
  constexpr char kCannotRead[] = "cannot read ";
  // A pipe that nobody writes to would keep it waiting.
  const LinuxHost::Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  FileContent content;
  if (!file.IsOpen() || fstat(file.Number(), &content.status) != 0) {
    LinuxHost::ThrowErrno(kCannotRead, path);
  }
  if (!S_ISREG(content.status.st_mode)) throw Refusal(path + " is no regular file");
  std::array<char, 65536> part{};
  while (content.bytes.size() <= most) {
    const ssize_t count = read(file.Number(), part.data(), part.size());
    if (count < 0) LinuxHost::ThrowErrno(kCannotRead, path);
    if (count == 0) return content;
    content.bytes.append(part.data(), static_cast<std::size_t>(count));
  }
  throw Refusal(path + " is too large: at most " + std::to_string(most) + " bytes are read");
}

}  // namespace SecPolicyCli
