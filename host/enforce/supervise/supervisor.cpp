#include "host/enforce/supervise/supervisor.h"

#include <fcntl.h>
#include <linux/seccomp.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/signalfd.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <map>
#include <sstream>

#include "braxo/lib/exception.h"
#include "host/enforce/plan/bpf_program.h"
#include "host/enforce/supervise/asked.h"
#include "host/enforce/supervise/caller.h"
#include "host/enforce/supervise/file_descriptor.h"
#include "host/enforce/system_calls.h"

// Newer than some headers: a call that was told is not told again because a signal came.
#ifndef SECCOMP_FILTER_FLAG_WAIT_KILLABLE_RECV
#define SECCOMP_FILTER_FLAG_WAIT_KILLABLE_RECV (1UL << 5)
#endif

namespace Enforce {
namespace {

// What tells the supervisor the number of the listener has to pass before anybody listens.
constexpr std::string_view kNeverNoticed = "write";

// Has flags that lie in memory, so no domain has it.
constexpr std::string_view kAnsweredUnknown = "clone3";

constexpr std::array kForwardedSignals = {SIGHUP,  SIGINT,  SIGQUIT, SIGTERM,
                                          SIGCONT, SIGUSR1, SIGUSR2};

constexpr int kSignalledStatus = 128;

[[noreturn]] void ThrowError(const char* what, int code) {
  throw Braxo::Lib::BraxoException(std::string(what) + ": " + std::strerror(code));
}

std::vector<sock_filter> FilterOf(const Supervision& supervision) {
  std::map<int, CallVerdict> calls;
  for (const SystemCall& call : SystemCalls()) {
    const bool isNoticed = call.name != kNeverNoticed && supervision.isNoticed(call.name);
    Answer answer = isNoticed ? Answer::kNoticed : Answer::kAllowed;
    if (call.name == kAnsweredUnknown) answer = Answer::kUnknown;
    calls.emplace(call.number, CallVerdict{.answer = answer, .conditions = {}});
  }
  return Assemble(calls, NativeArchitecture()).instructions;
}

// As execvp(3) does, but so that the program is executed once.
std::string FindProgram(const std::string& name) {
  const char* const variable = std::getenv("PATH");
  if (name.find('/') != std::string::npos) return name;
  std::istringstream path(variable == nullptr ? "/usr/bin:/bin" : variable);
  for (std::string directory; std::getline(path, directory, ':');) {
    std::string candidate = (directory.empty() ? "." : directory) + "/" + name;
    if (access(candidate.c_str(), X_OK) == 0) return candidate;
  }
  return name;
}

// ---- The child, until it is the program

int InstallFilter(std::vector<sock_filter>& filter) {
  const sock_fprog program = {static_cast<unsigned short>(filter.size()), filter.data()};
  const auto install = [&](unsigned long flags) {
    return static_cast<int>(syscall(SYS_seccomp, SECCOMP_SET_MODE_FILTER, flags, &program));
  };
  constexpr unsigned long kListener = SECCOMP_FILTER_FLAG_NEW_LISTENER;
  const int listener = install(kListener | SECCOMP_FILTER_FLAG_WAIT_KILLABLE_RECV);
  return listener < 0 && errno == EINVAL ? install(kListener) : listener;
}

// What the child tells its parent: that there is a listener and, if ever, that it was in vain.
struct Word {
  int listener = -1;
  int error = 0;
};

void Tell(int channel, const Word& word) { static_cast<void>(!write(channel, &word, sizeof word)); }

// By the path or, where one is open, the descriptor.
void Execute(const char* path, const Supervision& told, char* const* arguments) {
  if (told.program < 0) {
    execve(path, arguments, told.environment);
  } else {
    execveat(told.program, "", arguments, told.environment, AT_EMPTY_PATH);
  }
}

void EndWith(pid_t parent) {
  prctl(PR_SET_PDEATHSIG, SIGKILL, 0, 0, 0);
  if (getppid() != parent) _exit(kSignalledStatus + SIGKILL);
}

[[noreturn]] void BecomeProgram(const char* path, const Supervision& told, char* const* arguments,
                                std::vector<sock_filter>& filter, int channel,
                                const sigset_t& signals) {
  sigprocmask(SIG_SETMASK, &signals, nullptr);
  int listener = InstallFilter(filter);
  const bool isForbidden = listener < 0 && errno == EACCES;
  if (isForbidden && prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0) listener = InstallFilter(filter);
  Tell(channel, {.listener = listener, .error = listener < 0 ? errno : 0});
  if (listener < 0) _exit(kSignalledStatus - 1);
  Execute(path, told, arguments);
  Tell(channel, {.listener = listener, .error = errno});
  _exit(kSignalledStatus - 1);
}

// ---- The parent

// Signals that this process reads and is not ended by, while it lasts.
class HeldSignals {
 public:
  HeldSignals() {
    sigset_t held;
    sigemptyset(&held);
    sigaddset(&held, SIGCHLD);
    for (const int signal : kForwardedSignals) sigaddset(&held, signal);
    sigprocmask(SIG_BLOCK, &held, &before);
    queue = FileDescriptor(signalfd(-1, &held, SFD_CLOEXEC | SFD_NONBLOCK));
  }
  HeldSignals(const HeldSignals&) = delete;
  HeldSignals& operator=(const HeldSignals&) = delete;
  ~HeldSignals() { sigprocmask(SIG_SETMASK, &before, nullptr); }

  const sigset_t& Before() const { return before; }
  int Queue() const { return queue.Number(); }

 private:
  sigset_t before = {};
  FileDescriptor queue;
};

// Receives the calls of a program, and its end.
class Supervisor {
 public:
  Supervisor(const Supervision& told, pid_t child, FileDescriptor notices, int signals)
      : supervision(told), program(child), listener(std::move(notices)), queue(signals) {
    seccomp_notif_sizes sizes = {};
    syscall(SYS_seccomp, SECCOMP_GET_NOTIF_SIZES, 0, &sizes);
    noticeBytes.resize(std::max<std::size_t>(sizes.seccomp_notif, sizeof(seccomp_notif)));
    answerBytes.resize(std::max<std::size_t>(sizes.seccomp_notif_resp, sizeof(seccomp_notif_resp)));
  }

  // Returns the exit status of the program when all are gone.
  int Serve() {
    bool isWatched = true;
    while (isWatched && hasChildren) {
      std::array<pollfd, 2> sources = {{{listener.Number(), POLLIN, 0}, {queue, POLLIN, 0}}};
      if (poll(sources.data(), sources.size(), -1) < 0) continue;
      if ((sources[0].revents & POLLIN) != 0) ServeCall();
      if ((sources[1].revents & POLLIN) != 0) ServeSignal();
      isWatched = (sources[0].revents & (POLLIN | POLLHUP)) != POLLHUP;
    }
    while (isRunning && hasChildren) Reap(0);
    return exitStatus;
  }

 private:
  void ServeCall() {
    std::fill(noticeBytes.begin(), noticeBytes.end(), 0);
    auto* const notice = reinterpret_cast<seccomp_notif*>(noticeBytes.data());
    if (ioctl(listener.Number(), SECCOMP_IOCTL_NOTIF_RECV, notice) != 0) return;
    const Attempt attempt = AttemptOf(*notice);
    // What was read of a call that waits no more may be of another one.
    if (ioctl(listener.Number(), SECCOMP_IOCTL_NOTIF_ID_VALID, &notice->id) == 0) {
      supervision.notice(attempt);
    }
    std::fill(answerBytes.begin(), answerBytes.end(), 0);
    auto* const answer = reinterpret_cast<seccomp_notif_resp*>(answerBytes.data());
    answer->id = notice->id;
    answer->flags = SECCOMP_USER_NOTIF_FLAG_CONTINUE;
    ioctl(listener.Number(), SECCOMP_IOCTL_NOTIF_SEND, answer);
  }

  Attempt AttemptOf(const seccomp_notif& notice) {
    const auto thread = static_cast<pid_t>(notice.pid);
    const Caller caller(supervision.procDirectory, thread);
    Attempt attempt = {.call = NameOf(notice.data.nr),
                       .thread = thread,
                       .program = caller.Program(),
                       .isStart = !isStarted && thread == program,
                       .asked = AskedBy(notice.data, caller)};
    isStarted = isStarted || attempt.isStart;
    return attempt;
  }

  void ServeSignal() {
    signalfd_siginfo signal = {};
    if (read(queue, &signal, sizeof signal) != sizeof signal) return;
    const auto number = static_cast<int>(signal.ssi_signo);
    if (number == SIGCHLD) return Reap(WNOHANG);
    // The terminal sends its own to all of them.
    if (signal.ssi_code != SI_KERNEL) Forward(number);
  }

  // To the program or, when it has left others behind, to these.
  void Forward(int number) const {
    if (isRunning) {
      kill(program, number);
      return;
    }
    const FileDescriptor file(
        openat(supervision.procDirectory, "thread-self/children", O_RDONLY | O_CLOEXEC));
    std::array<char, 4096> text = {};
    if (!file.IsOpen() || read(file.Number(), text.data(), text.size() - 1) <= 0) return;
    std::istringstream children(text.data());
    for (pid_t child = 0; children >> child;) kill(child, number);
  }

  // All that have ended; of those that left others behind, these too.
  void Reap(int flags) {
    int status = 0;
    pid_t child = 0;
    while ((child = waitpid(-1, &status, flags)) > 0) {
      if (child != program) continue;
      isRunning = false;
      exitStatus = WIFSIGNALED(status) ? kSignalledStatus + WTERMSIG(status) : WEXITSTATUS(status);
      if (flags == 0) return;
    }
    hasChildren = child == 0 || errno != ECHILD;
  }

  const Supervision& supervision;
  const pid_t program;
  const FileDescriptor listener;
  const int queue;
  std::vector<char> noticeBytes;
  std::vector<char> answerBytes;
  bool isStarted = false;
  bool isRunning = true;
  bool hasChildren = true;
  int exitStatus = 0;
};

FileDescriptor TakeListener(pid_t child, int number) {
  const FileDescriptor process(syscall(SYS_pidfd_open, child, 0));
  FileDescriptor listener(syscall(SYS_pidfd_getfd, process.Number(), number, 0));
  if (listener.IsOpen()) return listener;
  const int code = errno;
  kill(child, SIGKILL);
  waitpid(child, nullptr, 0);
  ThrowError("cannot receive the calls of a program", code);
}

}  // namespace

SupervisedEnd Supervise(const std::vector<std::string>& command, const Supervision& supervision) {
  std::vector<sock_filter> filter = FilterOf(supervision);
  const std::string path = FindProgram(command.front());
  std::vector<std::string> words = command;
  std::vector<char*> arguments;
  arguments.reserve(words.size() + 1);
  for (std::string& word : words) arguments.push_back(word.data());
  arguments.push_back(nullptr);
  int ends[2] = {};
  if (pipe2(ends, O_CLOEXEC) != 0) ThrowError("cannot make a pipe", errno);
  const FileDescriptor channel(ends[0]);
  FileDescriptor childsEnd(ends[1]);
  const HeldSignals signals;
  prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0);
  const pid_t self = getpid();
  const pid_t child = fork();
  if (child < 0) ThrowError("cannot start a process", errno);
  if (child == 0) {
    if (supervision.isKilledAlong) EndWith(self);
    BecomeProgram(path.c_str(), supervision, arguments.data(), filter, childsEnd.Number(),
                  signals.Before());
  }
  childsEnd = {};
  Word word;
  const bool isTold = read(channel.Number(), &word, sizeof word) == sizeof word;
  if (!isTold || word.listener < 0) {
    waitpid(child, nullptr, 0);
    ThrowError("cannot watch the calls of a program", word.error);
  }
  Supervisor supervisor(supervision, child, TakeListener(child, word.listener), signals.Queue());
  SupervisedEnd end;
  end.exitStatus = supervisor.Serve();
  const bool isInVain = read(channel.Number(), &word, sizeof word) == sizeof word;
  if (isInVain) end.startError = word.error;
  return end;
}

}  // namespace Enforce
