#pragma once

#include <sys/types.h>

#include <functional>
#include <string>

namespace LinuxHostTest {

// A process of its own that runs `body`.
class ChildProcess {
 public:
  explicit ChildProcess(const std::function<void()>& body);
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;
  ~ChildProcess();

  pid_t Id() const { return id; }

  // Ends it at once, as nothing can be done against.
  void Kill();

  // Waits for its end. Returns "" when `body` returned, the message of the exception that it threw,
  // or "killed".
  std::string Wait();

 private:
  pid_t id;
  int messages;
  bool ended = false;
};

// Runs `body` in a process of its own and returns what Wait() returns.
std::string RunInChild(const std::function<void()>& body);

// Leaves this process room for a few more open files, however many the tests were started with.
// Returns false when that cannot be done.
bool LimitDescriptors();

}  // namespace LinuxHostTest
