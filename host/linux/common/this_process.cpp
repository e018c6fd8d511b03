#include "host/linux/common/this_process.h"

#include <pthread.h>
#include <unistd.h>

#include <atomic>

namespace LinuxHost {

unsigned int ForksUntilNow() {
  static std::atomic<unsigned int> forks = 0;
  [[maybe_unused]] static const int registered =
      pthread_atfork(nullptr, nullptr, [] { forks.fetch_add(1, std::memory_order_relaxed); });
  return forks.load(std::memory_order_relaxed);
}

pid_t ThisProcess() {
  struct Known {
    unsigned int forks = ForksUntilNow();
    pid_t process = getpid();
  };
  thread_local Known known;
  if (known.forks != ForksUntilNow()) known = {};
  return known.process;
}

}  // namespace LinuxHost
