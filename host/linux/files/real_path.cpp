#include <climits>
#include <cstdlib>
#include <cstring>

#include "zorvan/kernel.h"

namespace Zorvan::Kernel {
namespace {

constexpr std::size_t kResolvedSize = 1984;  // as in the kernel's own file records

}  // namespace

int RealPath(const char* path, char* resolved) {
  char canonical[PATH_MAX];
  if (realpath(path, canonical) == nullptr) return -1;
  const std::size_t size = std::strlen(canonical) + 1;
  if (size > kResolvedSize) return -1;
  std::memcpy(resolved, canonical, size);
  return 0;
}

}  // namespace Zorvan::Kernel
