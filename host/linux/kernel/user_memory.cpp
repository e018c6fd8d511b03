#include "host/linux/kernel/user_memory.h"

#include <sys/syscall.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

#include "host/linux/common/host_error.h"
#include "host/linux/common/this_process.h"

namespace LinuxHost {
namespace {

constexpr std::size_t kPage = 4096;

iovec At(std::uint64_t address, std::size_t size) {
  return {reinterpret_cast<void*>(address), size};
}

iovec At(const void* own, std::size_t size) { return {const_cast<void*>(own), size}; }

// The kernel checks the addresses, also of the process's own memory. By the call's number, since a
// sanitizer's own function of that name would take the addresses for good.
template <std::size_t count>
void Copy(const std::array<iovec, count>& to, const std::array<iovec, count>& from) {
  std::size_t size = 0;
  for (const iovec& piece : from) size += piece.iov_len;
  const auto copied =
      syscall(SYS_process_vm_readv, ThisProcess(), to.data(), count, from.data(), count, 0UL);
  if (copied >= 0 && static_cast<std::size_t>(copied) == size) return;
  if (copied < 0 && (errno == EPERM || errno == ENOSYS)) ThrowErrno();
  throw HostError(EFAULT, "bad address");
}

}  // namespace

void ReadUser(std::uint64_t address, void* to, std::size_t size) {
  Copy<1>({At(to, size)}, {At(address, size)});
}

void WriteUser(std::uint64_t address, const void* from, std::size_t size) {
  Copy<1>({At(address, size)}, {At(from, size)});
}

void ReadAndWriteUser(std::uint64_t source, void* to, std::size_t size, std::uint64_t target,
                      const void* from, std::size_t sizeBack) {
  Copy<2>({At(to, size), At(target, sizeBack)}, {At(source, size), At(from, sizeBack)});
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
