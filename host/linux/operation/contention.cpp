#include "contention.h"

#include <chrono>
#include <random>
#include <thread>

namespace LinuxHost {

void LetOthersGoFirst(int tries) {
  std::random_device chance;
  std::uniform_int_distribution<int> wait(0, (8 << tries) - 1);
  std::this_thread::sleep_for(std::chrono::milliseconds(wait(chance)));
}

}  // namespace LinuxHost
