#include "run_child.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>

namespace HostileTest {

ChildOutcome RunChild(const std::vector<std::string>& arguments) {
  std::array<int, 2> channel{};
  if (pipe2(channel.data(), O_CLOEXEC) != 0) return {-1, "no pipe"};
  std::vector<char*> argv = {const_cast<char*>(HOSTILE_CHILD)};
  for (const std::string& argument : arguments) argv.push_back(const_cast<char*>(argument.c_str()));
  argv.push_back(nullptr);

  const pid_t child = fork();
  if (child == 0) {
    dup2(channel[1], STDOUT_FILENO);
    execv(HOSTILE_CHILD, argv.data());
    _exit(127);
  }
  close(channel[1]);
  ChildOutcome outcome{-1, ""};
  std::array<char, 4096> buffer{};
  ssize_t size = 0;
  while ((size = read(channel[0], buffer.data(), buffer.size())) > 0) {
    outcome.output.append(buffer.data(), static_cast<std::size_t>(size));
  }
  close(channel[0]);
  waitpid(child, &outcome.status, 0);
  return outcome;
}

}  // namespace HostileTest
