#include "host/linux/kernel/user_memory.h"

#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

#include "host/linux/common/host_error.h"

namespace LinuxHost {
namespace {

constexpr std::size_t kPage = 4096;

using Copier = ssize_t (*)(pid_t, const iovec*, unsigned long, const iovec*, unsigned long,
                           unsigned long);

// The kernel checks the addresses, also of the process's own memory.
void Copy(Copier copy, std::uint64_t address, void* own, std::size_t size) {
  const iovec local{own, size};
  const iovec remote{reinterpret_cast<void*>(address), size};
  const ssize_t copied = copy(getpid(), &local, 1, &remote, 1, 0);
  if (copied >= 0 && static_cast<std::size_t>(copied) == size) return;
  if (copied < 0 && (errno == EPERM || errno == ENOSYS)) ThrowErrno();
  throw HostError(EFAULT, "bad address");
}

}  // namespace

void ReadUser(std::uint64_t address, void* to, std::size_t size) {
  Copy(process_vm_readv, address, to, size);
}

void WriteUser(std::uint64_t address, const void* from, std::size_t size) {
  Copy(process_vm_writev, address, const_cast<void*>(from), size);
}

std::string ReadUserText(std::uint64_t address, std::size_t maxLength) {
  std::string text;
  std::array<char, kPage> piece;
  // Never reads beyond the page that is known to hold a part of the text.
  while (text.size() <= maxLength) {
    const std::uint64_t position = address + text.size();
    const std::size_t size =
        std::min<std::size_t>(maxLength + 1 - text.size(), kPage - position % kPage);
    ReadUser(position, piece.data(), size);
    const auto end = std::find(piece.begin(), piece.begin() + size, '\0');
    text.append(piece.begin(), end);
    if (end != piece.begin() + size) return text;
  }
  throw HostError(ENAMETOOLONG, "text too long");
}

}  // namespace LinuxHost
