#include "command.h"

#include <signal.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <stdexcept>

namespace CrashTest {
namespace {

int MakeFile() {
  const int descriptor = memfd_create("output", MFD_CLOEXEC);
  if (descriptor < 0) throw std::runtime_error("unable to make a file in memory");
  return descriptor;
}

std::string ReadAndClose(int descriptor) {
  std::string content;
  lseek(descriptor, 0, SEEK_SET);
  std::array<char, 4096> piece{};
  for (ssize_t size = 0; (size = read(descriptor, piece.data(), piece.size())) > 0;) {
    content.append(piece.data(), static_cast<std::size_t>(size));
  }
  close(descriptor);
  return content;
}

}  // namespace

Command::Command(const std::filesystem::path& root, const std::vector<std::string>& arguments)
    : output(MakeFile()), errors(MakeFile()) {
  std::vector<const char*> argv = {SECPOLICY_COMMAND, "--root", root.c_str()};
  for (const std::string& argument : arguments) argv.push_back(argument.c_str());
  argv.push_back(nullptr);

  id = fork();
  if (id < 0) throw std::runtime_error("unable to fork");
  if (id != 0) return;
  dup2(output, STDOUT_FILENO);
  dup2(errors, STDERR_FILENO);
  // What does not end is ended, as a crash is. Nothing here takes a second on an idle machine.
  alarm(300);
  unsetenv("SECPOLICY_HOST_STATE");
  unsetenv("SECPOLICY_HOST_CONFIG");
  // Leaks are looked for in /proc, which is not below the root.
  setenv("ASAN_OPTIONS", "detect_leaks=0", 1);
  execv(SECPOLICY_COMMAND, const_cast<char**>(argv.data()));
  _exit(127);
}

Command::~Command() {
  if (id < 0) return;
  Kill();
  Wait();
}

void Command::Kill() const { kill(id, SIGKILL); }

Outcome Command::Wait() {
  int status = 0;
  waitpid(id, &status, 0);
  id = -1;
  return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, ReadAndClose(output), ReadAndClose(errors)};
}

Outcome RunCommand(const std::filesystem::path& root, const std::vector<std::string>& arguments) {
  return Command(root, arguments).Wait();
}

bool LongTests() {
  const char* wanted = std::getenv("SECPOLICY_LONG_TESTS");
  return wanted != nullptr && std::string(wanted) == "1";
}

}  // namespace CrashTest
