#include "host/linux/files/real_path.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>

#include <climits>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <string_view>

#include "host/linux/common/descriptor.h"
#include "zorvan/kernel.h"

namespace LinuxHost {
namespace {

constexpr std::size_t kResolvedSize = 1984;  // as in the kernel's own file records

// True for a path from the root whose parts are all names.
bool IsOfNames(std::string_view path) {
  if (!path.starts_with('/')) return false;
  while (!path.empty()) {
    path.remove_prefix(1);
    const std::string_view name = path.substr(0, path.find('/'));
    if (name.empty() || name == "." || name == "..") return false;
    path.remove_prefix(name.size());
  }
  return true;
}

// Those that were found to lead over no link, where they are remembered.
std::optional<std::set<std::string, std::less<>>>& Remembered() {
  thread_local std::optional<std::set<std::string, std::less<>>> paths;
  return paths;
}

bool IsOpenedWithoutLinks(const char* path) {
  open_how how{};
  how.flags = O_PATH | O_CLOEXEC;
  how.resolve = RESOLVE_NO_SYMLINKS;
  const auto opened = syscall(SYS_openat2, AT_FDCWD, path, &how, sizeof how);
  return Descriptor(static_cast<int>(opened)).IsOpen();
}

bool LeadsOverNoLink(const char* path) {
  auto& remembered = Remembered();
  if (!remembered) return IsOpenedWithoutLinks(path);
  if (remembered->contains(path)) return true;
  if (!IsOpenedWithoutLinks(path)) return false;
  remembered->emplace(path);
  return true;
}

int Take(const char* path, char* resolved) {
  const std::size_t size = std::strlen(path) + 1;
  if (size > kResolvedSize) return -1;
  std::memcpy(resolved, path, size);
  return 0;
}

}  // namespace

OneLook::OneLook() { Remembered().emplace(); }

OneLook::~OneLook() { Remembered().reset(); }

}  // namespace LinuxHost

namespace Zorvan::Kernel {

// Most paths are written as they resolve, which the kernel tells in one step.
int RealPath(const char* path, char* resolved) {
  if (LinuxHost::IsOfNames(path) && LinuxHost::LeadsOverNoLink(path)) {
    return LinuxHost::Take(path, resolved);
  }
  char canonical[PATH_MAX];
  if (realpath(path, canonical) == nullptr) return -1;
  return LinuxHost::Take(canonical, resolved);
}

}  // namespace Zorvan::Kernel
