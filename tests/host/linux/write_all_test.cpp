// Hunts bytes that get lost where a write is interrupted or cut short, and a failure that is not
// told.

#include "host/linux/common/write_all.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <pthread.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <string>
#include <thread>

namespace LinuxHostTest {
namespace {

TEST(WriteAll, TellsAFailure) {
  errno = 0;
  EXPECT_FALSE(LinuxHost::WriteAll(-1, "text"));
  EXPECT_EQ(errno, EBADF);
  EXPECT_TRUE(LinuxHost::WriteAll(-1, ""));
}

// Ends calls that wait, of the thread that it is sent to, without starting them again.
void InterruptBy(int signal) {
  struct sigaction action {};
  action.sa_handler = [](int) {};
  sigaction(signal, &action, nullptr);
}

TEST(WriteAll, GoesOnAfterASignal) {
  InterruptBy(SIGUSR1);
  int ends[2] = {};
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  const std::string text(1 << 20, 'x');
  const pthread_t writer = pthread_self();
  std::size_t arrived = 0;
  std::thread reader([&] {
    std::array<char, 1 << 12> piece{};
    while (arrived < text.size()) {
      // The first one ends a write that has come some way, the second one that has not.
      for (int time = 0; time < 2; ++time) {
        usleep(500);
        pthread_kill(writer, SIGUSR1);
      }
      usleep(500);
      const ssize_t count = read(ends[0], piece.data(), piece.size());
      if (count <= 0) break;
      arrived += static_cast<std::size_t>(count);
    }
    close(ends[0]);
  });
  EXPECT_TRUE(LinuxHost::WriteAll(ends[1], text));
  close(ends[1]);
  reader.join();
  EXPECT_EQ(arrived, text.size());
}

}  // namespace
}  // namespace LinuxHostTest
