#include "forked.h"

#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <exception>
#include <iostream>
#include <thread>

#include "host/linux/common/host_error.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

ExitCode Try(const std::function<ExitCode()>& body) {
  try {
    return body();
  } catch (const std::exception& failure) {
    std::cerr << "secpolicy: " << VisibleLines(failure.what()) << std::endl;
    return kFailed;
  }
}

// Nobody would clear up after a child whose parent was killed. The parent may be gone already.
void DieWith(pid_t parent) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (getppid() != parent) _exit(kFailed);
}

pid_t Fork(const std::function<ExitCode()>& body) {
  std::cout.flush();
  std::cerr.flush();
  const pid_t parent = getpid();
  const pid_t child = fork();
  if (child < 0) LinuxHost::ThrowErrno("cannot fork");
  if (child == 0) {
    DieWith(parent);
    RunAndExit(body);
  }
  return child;
}

ForkedEnd EndOf(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) LinuxHost::ThrowErrno("cannot wait");
  }
  if (WIFEXITED(status)) return {.code = static_cast<ExitCode>(WEXITSTATUS(status)), .death = ""};
  return {.code = kFailed, .death = strsignal(WTERMSIG(status))};
}

}  // namespace

void RunAndExit(const std::function<ExitCode()>& body) noexcept {
  ExitCode code = kFailed;
  // Connections to the state are a thread's, and are closed when it ends.
  std::thread([&] { code = Try(body); }).join();
  std::cout.flush();
  std::cerr.flush();
  _exit(code);
}

ForkedEnd RunForked(const std::function<ExitCode()>& body) { return EndOf(Fork(body)); }

}  // namespace SecPolicyCli
