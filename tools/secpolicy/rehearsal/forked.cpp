#include "forked.h"

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <iostream>
#include <system_error>

#include "text/visible.h"

namespace SecPolicyCli {
namespace {

[[noreturn]] void RunChild(const std::function<ExitCode()>& body) {
  ExitCode code = kFailed;
  try {
    code = body();
  } catch (const std::exception& failure) {
    std::cerr << "secpolicy: " << VisibleLines(failure.what()) << std::endl;
  }
  // Closes the connections to the state. What the parent has on its stack is not cleaned up.
  std::exit(code);
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
  if (child < 0) throw std::system_error(errno, std::generic_category(), "cannot fork");
  if (child == 0) {
    DieWith(parent);
    RunChild(body);
  }
  return child;
}

// Waits for the end of the child, whose number stays taken.
void WaitFor(pid_t child) {
  siginfo_t ignored{};
  while (waitid(P_PID, static_cast<id_t>(child), &ignored, WEXITED | WNOWAIT) < 0) {
    if (errno != EINTR) throw std::system_error(errno, std::generic_category(), "cannot wait");
  }
}

ForkedEnd EndOf(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) throw std::system_error(errno, std::generic_category(), "cannot wait");
  }
  if (WIFEXITED(status)) return {.code = static_cast<ExitCode>(WEXITSTATUS(status)), .death = ""};
  return {.code = kFailed, .death = strsignal(WTERMSIG(status))};
}

volatile std::sig_atomic_t receiver = 0;

void PassOn(int signal) {
  const int before = errno;
  if (receiver != 0) kill(receiver, signal);
  errno = before;
}

}  // namespace

ForkedEnd RunForked(const std::function<ExitCode()>& body) { return EndOf(Fork(body)); }

InterruptibleChild::InterruptibleChild() {
  sigset_t signals;
  sigemptyset(&signals);
  for (const int signal : kSignals) sigaddset(&signals, signal);
  // Until there is a child to pass them on to.
  sigprocmask(SIG_BLOCK, &signals, &maskBefore);
  for (std::size_t index = 0; index < kSignals.size(); ++index) {
    sigaction(kSignals[index], nullptr, &actionsBefore[index]);
    // What the caller ignores, as nohup(1) does, stays ignored.
    if (actionsBefore[index].sa_handler == SIG_IGN) continue;
    struct sigaction action {};
    action.sa_handler = kSignals[index] == SIGPIPE ? SIG_IGN : PassOn;
    action.sa_flags = SA_RESTART;
    sigaction(kSignals[index], &action, nullptr);
  }
}

InterruptibleChild::~InterruptibleChild() { Restore(); }

void InterruptibleChild::Restore() {
  for (std::size_t index = 0; index < kSignals.size(); ++index) {
    sigaction(kSignals[index], &actionsBefore[index], nullptr);
  }
  sigprocmask(SIG_SETMASK, &maskBefore, nullptr);
}

ForkedEnd InterruptibleChild::Run(const std::function<ExitCode()>& body) {
  const pid_t child = Fork([&] {
    Restore();
    return body();
  });
  receiver = child;
  sigprocmask(SIG_SETMASK, &maskBefore, nullptr);
  WaitFor(child);
  receiver = 0;
  return EndOf(child);
}

}  // namespace SecPolicyCli
