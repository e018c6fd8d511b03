#pragma once

#include <cerrno>

namespace LinuxHost {

// Leaves errno as it found it.
class ErrnoGuard {
 public:
  ErrnoGuard() : saved(errno) {}
  ErrnoGuard(const ErrnoGuard&) = delete;
  ErrnoGuard& operator=(const ErrnoGuard&) = delete;
  ~ErrnoGuard() { errno = saved; }

 private:
  int saved;
};

}  // namespace LinuxHost
