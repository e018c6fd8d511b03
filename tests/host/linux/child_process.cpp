#include "child_process.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <exception>

namespace LinuxHostTest {
namespace {

[[noreturn]] void RunAndExit(const std::function<void()>& body, int messages) {
  try {
    body();
  } catch (const std::exception& exception) {
    const std::string message = exception.what();
    if (write(messages, message.data(), message.size()) < 0) _exit(2);
    _exit(1);
  }
  _exit(0);
}

}  // namespace

ChildProcess::ChildProcess(const std::function<void()>& body) {
  std::array<int, 2> ends{};
  if (pipe(ends.data()) != 0) std::terminate();
  id = fork();
  if (id < 0) std::terminate();
  if (id == 0) {
    close(ends[0]);
    RunAndExit(body, ends[1]);
  }
  close(ends[1]);
  messages = ends[0];
}

ChildProcess::~ChildProcess() {
  if (!ended) {
    Kill();
    Wait();
  }
  close(messages);
}

void ChildProcess::Kill() { kill(id, SIGKILL); }

std::string ChildProcess::Wait() {
  std::string message;
  std::array<char, 1024> piece{};
  for (ssize_t size = 1; size > 0;) {
    size = read(messages, piece.data(), piece.size());
    if (size > 0) message.append(piece.data(), static_cast<std::size_t>(size));
  }
  int status = 0;
  waitpid(id, &status, 0);
  ended = true;
  return WIFSIGNALED(status) ? "killed" : message;
}

std::string RunInChild(const std::function<void()>& body) { return ChildProcess(body).Wait(); }

bool LimitDescriptors() {
  constexpr rlim_t kRoom = 10;
  const int next = open("/", O_PATH | O_CLOEXEC);
  if (next < 0 || close(next) != 0) return false;
  const rlim_t most = static_cast<rlim_t>(next) + kRoom;
  const rlimit limit = {most, most};
  return setrlimit(RLIMIT_NOFILE, &limit) == 0;
}

}  // namespace LinuxHostTest
