#include "below_root.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

// In older C libraries this header has no `extern "C"` of its own.
extern "C" {
#include <sys/pidfd.h>
}

#include "dry_run/forked.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/operation/store_fork.h"
#include "root.h"

namespace SecPolicyPython {
namespace {

using LinuxHost::Descriptor;
using LinuxHost::HostError;
using LinuxHost::ThrowErrno;

using Work = std::function<void(const Send&)>;

// A file without a name. Not by the number 0, 1 or 2, should the interpreter have closed these: the
// child puts another file there.
Descriptor MakeFile() {
  Descriptor file(memfd_create("secpolicy", MFD_CLOEXEC));
  if (file.IsOpen()) file = Descriptor(fcntl(file.Number(), F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
  if (!file.IsOpen()) ThrowErrno("cannot make a file in memory");
  return file;
}

// The file is all by which the child tells its parent anything, also that it has failed.
void WriteOrExit(const Descriptor& file, const std::string& text) {
  for (std::size_t written = 0; written < text.size();) {
    const ssize_t size = write(file.Number(), text.data() + written, text.size() - written);
    if (size < 0) _exit(SecPolicyCli::kFailed);
    written += static_cast<std::size_t>(size);
  }
}

std::string ReadAll(const Descriptor& file) {
  std::string text;
  char part[65536];
  while (true) {
    const auto offset = static_cast<off_t>(text.size());
    const ssize_t size = pread(file.Number(), part, sizeof part, offset);
    if (size <= 0) return text;
    text.append(part, static_cast<std::size_t>(size));
  }
}

// No signal reaches the calling thread while this lives, so that no handler of the interpreter runs
// in the child before ForgetHandlers().
class BlockedSignals {
 public:
  BlockedSignals() {
    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, &before);
  }
  BlockedSignals(const BlockedSignals&) = delete;
  BlockedSignals& operator=(const BlockedSignals&) = delete;
  ~BlockedSignals() { pthread_sigmask(SIG_SETMASK, &before, nullptr); }

 private:
  sigset_t before;
};

pid_t Fork() {
  const LinuxHost::StoresAtRest stores;
  return fork();
}

// No handler of the interpreter runs in the child. What the interpreter ignores the child ignores,
// but for SIGTERM, by which it is ended. Signals of the terminal's keys stay blocked: they reach
// the interpreter as well, and whether it ends the child is for it to say.
void ForgetHandlers() {
  struct sigaction usual {};
  usual.sa_handler = SIG_DFL;
  for (int number = 1; number < NSIG; ++number) {
    struct sigaction present {};
    const bool isKnown = sigaction(number, nullptr, &present) == 0;
    const bool isKept = present.sa_handler == SIG_IGN && number != SIGTERM;
    if (isKnown && !isKept) sigaction(number, &usual, nullptr);
  }
  sigset_t keys;
  sigemptyset(&keys);
  sigaddset(&keys, SIGINT);
  sigaddset(&keys, SIGQUIT);
  sigprocmask(SIG_SETMASK, &keys, nullptr);
}

std::string DeathOf(int status) {
  return WIFSIGNALED(status) ? std::string(": ") + strsignal(WTERMSIG(status)) : "";
}

void WaitFor(pid_t child) {
  while (waitpid(child, nullptr, 0) < 0 && errno == EINTR) continue;
}

class Child {
 public:
  Child(const std::optional<std::string>& root, const Work& work) {
    const pid_t parent = getpid();
    const BlockedSignals blocked;
    id = Fork();
    if (id < 0) ThrowErrno("cannot fork");
    if (id == 0) Act(parent, root, work);
    end = Descriptor(pidfd_open(id, 0));
    // ESRCH: the child has ended already, in a program that ignores SIGCHLD, where nobody waits for
    // it.
    if (!end.IsOpen() && errno != ESRCH) GiveUp();
  }
  Child(const Child&) = delete;
  Child& operator=(const Child&) = delete;
  ~Child() {
    if (isOver) return;
    pidfd_send_signal(end.Number(), SIGTERM, nullptr, 0);
    WaitFor(id);
  }

  // Returns what it has sent.
  Reply Reap(const std::function<void()>& checkSignals) {
    Await(checkSignals);
    isOver = true;
    // In a program that ignores SIGCHLD, or waits for all its children, the status is lost.
    int status = 0;
    const bool isKnown = waitpid(id, &status, 0) == id;
    const std::string text = ReadAll(sent);
    const std::size_t kindSize = text.find('\n');
    if (kindSize == std::string::npos) {
      throw HostError(ECHILD, "the process that does the work ended without an answer" +
                                  (isKnown ? DeathOf(status) : ""));
    }
    return {text.substr(0, kindSize), text.substr(kindSize + 1), ReadAll(messages)};
  }

 private:
  [[noreturn]] void GiveUp() const {
    const int reason = errno;
    kill(id, SIGTERM);
    WaitFor(id);
    errno = reason;
    ThrowErrno("cannot watch a process");
  }

  // Until it has ended.
  void Await(const std::function<void()>& checkSignals) const {
    // poll is not interrupted by a signal that another thread takes, or that comes just before it.
    constexpr int kMostMilliseconds = 100;
    pollfd ended{.fd = end.Number(), .events = POLLIN, .revents = 0};
    while (end.IsOpen() && poll(&ended, 1, kMostMilliseconds) <= 0) checkSignals();
  }

  [[noreturn]] void Act(pid_t parent, const std::optional<std::string>& root,
                        const Work& work) const noexcept {
    for (int standard = 0; standard <= STDERR_FILENO; ++standard) {
      dup2(messages.Number(), standard);
    }
    ForgetHandlers();
    const Send send = [this](const Reply& reply) {
      WriteOrExit(sent, reply.kind + "\n" + reply.document);
    };
    if (root) Enter(*root, send);
    // After the root was entered: to enter a user namespace takes this back.
    prctl(PR_SET_PDEATHSIG, SIGTERM);
    if (getppid() != parent) _exit(SecPolicyCli::kFailed);
    SecPolicyCli::RunAndExit([&] {
      SendFailureOf([&] { work(send); }, send);
      return SecPolicyCli::kWell;
    });
  }

  static void Enter(const std::string& root, const Send& send) {
    try {
      SecPolicyCli::EnterRoot(root);
    } catch (const HostError& failure) {
      send(ToReply("root", failure));
      _exit(SecPolicyCli::kFailed);
    }
  }

  const Descriptor sent = MakeFile();
  const Descriptor messages = MakeFile();
  pid_t id = -1;
  bool isOver = false;
  Descriptor end = Descriptor(-1);  // tells that it has ended
};

}  // namespace

Reply RunBelow(const std::optional<std::string>& root, const Work& work,
               const std::function<void()>& checkSignals) {
  return Child(root, work).Reap(checkSignals);
}

}  // namespace SecPolicyPython
