#include "host/enforce/broker/broker.h"

#include <dirent.h>
#include <fcntl.h>
#include <poll.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <optional>
#include <utility>
#include <vector>

#include "braxo/lib/exception.h"
#include "host/enforce/launcher/number.h"

namespace Enforce {
namespace {

// Each takes two descriptors.
constexpr std::size_t kMostEntries = 256;

constexpr int kSignalledStatus = 128;

[[noreturn]] void ThrowErrno(const char* what) {
  const int code = errno;
  throw Braxo::Lib::BraxoException(std::string(what) + ": " + std::strerror(code));
}

// ---- A message

struct Message {
  std::string bytes;
  std::vector<FileDescriptor> descriptors;
  std::optional<ucred> sender;
  bool isWhole = false;
};

void TakeControl(const cmsghdr& control, Message* message) {
  if (control.cmsg_level != SOL_SOCKET) return;
  const unsigned char* const data = CMSG_DATA(&control);
  const std::size_t size = control.cmsg_len - CMSG_LEN(0);
  if (control.cmsg_type == SCM_CREDENTIALS && size == sizeof(ucred)) {
    std::memcpy(&message->sender.emplace(), data, size);
  }
  if (control.cmsg_type != SCM_RIGHTS) return;
  for (std::size_t offset = 0; offset + sizeof(int) <= size; offset += sizeof(int)) {
    int number = -1;
    std::memcpy(&number, data + offset, sizeof(number));
    message->descriptors.emplace_back(number);
  }
}

// Nothing when there is none by now; the end of the conversation has no sender.
std::optional<Message> Receive(int socket) {
  Message message;
  message.bytes.resize(kMostRequestBytes);
  iovec part = {message.bytes.data(), message.bytes.size()};
  alignas(cmsghdr)
      std::array<char, CMSG_SPACE(sizeof(ucred)) + CMSG_SPACE(sizeof(int) * kEntryDescriptors)>
          control{};
  msghdr header = {};
  header.msg_iov = &part;
  header.msg_iovlen = 1;
  header.msg_control = control.data();
  header.msg_controllen = control.size();
  const ssize_t size = recvmsg(socket, &header, MSG_DONTWAIT | MSG_CMSG_CLOEXEC);
  if (size < 0 && (errno == EAGAIN || errno == EINTR)) return std::nullopt;
  if (size < 0) return message;
  message.bytes.resize(static_cast<std::size_t>(size));
  message.isWhole = (header.msg_flags & (MSG_TRUNC | MSG_CTRUNC)) == 0;
  for (cmsghdr* next = CMSG_FIRSTHDR(&header); next != nullptr; next = CMSG_NXTHDR(&header, next)) {
    TakeControl(*next, &message);
  }
  return message;
}

// ---- Descriptors

bool IsKind(const FileDescriptor& file, mode_t kind) {
  struct stat status = {};
  return fstat(file.Number(), &status) == 0 && (status.st_mode & S_IFMT) == kind;
}

// The same pipe, which waits for nobody who has it, too. Nothing where who sent it could not use it
// this way: a path can be opened to neither read nor write.
FileDescriptor OwnEnd(const FileDescriptor& pipe, int access, int procDirectory) {
  const int flags = fcntl(pipe.Number(), F_GETFL);
  const bool isUsable = IsKind(pipe, S_IFIFO) && flags >= 0 && (flags & O_PATH) == 0 &&
                        ((flags & O_ACCMODE) == access || (flags & O_ACCMODE) == O_RDWR);
  if (!isUsable) return {};
  const std::string link = "thread-self/fd/" + std::to_string(pipe.Number());
  return FileDescriptor(openat(procDirectory, link.c_str(), access | O_NONBLOCK | O_CLOEXEC));
}

// ---- The process that was forked

// Something that can be neither read nor written.
void CloseStandardDescriptors() {
  const FileDescriptor nothing(open("/", O_PATH | O_CLOEXEC));
  for (int number = STDIN_FILENO; number <= STDERR_FILENO; ++number) dup2(nothing.Number(), number);
}

// What the caller of this program had open. What it has opened itself is closed on execution.
void CloseInherited(int procDirectory) {
  const int list = openat(procDirectory, "thread-self/fd", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  DIR* const directory = list < 0 ? nullptr : fdopendir(list);
  if (directory == nullptr) return;
  while (const dirent* const entry = readdir(directory)) {
    const auto number = ReadNumber(entry->d_name);
    if (number && *number > STDERR_FILENO && fcntl(*number, F_GETFD) == 0) close(*number);
  }
  closedir(directory);
}

// ---- The broker

class Broker {
 public:
  Broker(const Brokerage& told, FileDescriptor here) : brokerage(told), socket(std::move(here)) {
    // Or children would vanish without a word.
    static_cast<void>(signal(SIGCHLD, SIG_DFL));
    sigset_t held;
    sigfillset(&held);
    sigprocmask(SIG_SETMASK, &held, &signalsBefore);
    sigset_t ends;
    sigemptyset(&ends);
    sigaddset(&ends, SIGCHLD);
    children = FileDescriptor(signalfd(-1, &ends, SFD_CLOEXEC | SFD_NONBLOCK));
  }

  void Serve() {
    while (socket.IsOpen() || !entries.empty()) {
      std::vector<pollfd> sources = {{socket.Number(), POLLIN, 0}, {children.Number(), POLLIN, 0}};
      for (const Entry& entry : entries) sources.push_back({entry.signals.Number(), POLLIN, 0});
      if (poll(sources.data(), sources.size(), -1) < 0) continue;
      for (std::size_t index = 0; index < entries.size(); ++index) {
        if (sources[index + 2].revents != 0) HandOnSignals(entries[index]);
      }
      if (sources[1].revents != 0) Reap();
      if (sources[0].revents == 0) continue;
      if (auto message = Receive(socket.Number())) Take(std::move(*message));
    }
  }

 private:
  // A program that was started.
  struct Entry {
    pid_t process = -1;
    FileDescriptor answers;
    FileDescriptor signals;  // none when who asked has ended
  };

  void Take(Message message) {
    if (!message.sender) {
      socket = {};
      return;
    }
    if (message.descriptors.size() != kEntryDescriptors) return;
    Entry entry;
    entry.answers = OwnEnd(message.descriptors[kAnswers], O_WRONLY, brokerage.procDirectory);
    if (!entry.answers.IsOpen()) return;
    entry.signals = OwnEnd(message.descriptors[kSignals], O_RDONLY, brokerage.procDirectory);
    AskedEntry asked;
    int error = ReasonAgainst(message, entry, &asked.request);
    if (error == 0) error = Start(message, std::move(asked), &entry);
    if (error != 0) {
      Answer(entry, {.kind = EntryAnswer::kRefused, .value = static_cast<std::uint32_t>(error)});
    } else {
      entries.push_back(std::move(entry));
    }
  }

  // 0, or the system error that tells why nothing is started.
  int ReasonAgainst(const Message& message, const Entry& entry, EntryRequest* request) const {
    const bool isReadable = message.isWhole && entry.signals.IsOpen() &&
                            IsKind(message.descriptors[kProgram], S_IFREG) &&
                            IsKind(message.descriptors[kDirectory], S_IFDIR) &&
                            Parse(message.bytes, request);
    if (!isReadable) return EBADMSG;
    // What it starts has the rights of its own user.
    if (message.sender->uid != geteuid() || message.sender->gid != getegid()) return EPERM;
    return entries.size() < kMostEntries ? 0 : EAGAIN;
  }

  int Start(Message& message, AskedEntry asked, Entry* entry) {
    entry->process = fork();
    if (entry->process < 0) return errno;
    if (entry->process > 0) return 0;
    asked.program = std::move(message.descriptors[kProgram]);
    asked.directory = std::move(message.descriptors[kDirectory]);
    *entry = {};
    Become(std::move(message), std::move(asked));
  }

  [[noreturn]] void Become(Message message, AskedEntry asked) {
    for (int number = STDIN_FILENO; number <= STDERR_FILENO; ++number) {
      dup2(message.descriptors[kInput + static_cast<unsigned int>(number)].Number(), number);
    }
    // So that the terminal's signals reach it.
    setpgid(0, getpgid(message.sender->pid));
    message.descriptors.clear();
    entries.clear();
    socket = {};
    children = {};
    sigprocmask(SIG_SETMASK, &signalsBefore, nullptr);
    _exit(brokerage.enter(std::move(asked)));
  }

  static void HandOnSignals(Entry& entry) {
    std::array<unsigned char, 64> signals{};
    const ssize_t size = read(entry.signals.Number(), signals.data(), signals.size());
    if (size < 0) return;
    for (ssize_t index = 0; index < size; ++index) {
      const int signal = signals[static_cast<std::size_t>(index)];
      if (std::ranges::count(kHandedOnSignals, signal) > 0) kill(entry.process, signal);
    }
    if (size > 0) return;
    // Who asked has been killed, or it would be waiting.
    kill(entry.process, SIGKILL);
    entry.signals = {};
  }

  void Reap() {
    signalfd_siginfo signal = {};
    static_cast<void>(!read(children.Number(), &signal, sizeof(signal)));
    int status = 0;
    pid_t process = 0;
    while ((process = waitpid(-1, &status, WNOHANG)) > 0) {
      const auto ended = std::ranges::find(entries, process, &Entry::process);
      if (ended == entries.end()) continue;
      const int code =
          WIFSIGNALED(status) ? kSignalledStatus + WTERMSIG(status) : WEXITSTATUS(status);
      Answer(*ended, {.kind = EntryAnswer::kEnded, .value = static_cast<std::uint32_t>(code)});
      entries.erase(ended);
    }
  }

  static void Answer(const Entry& entry, const EntryAnswer& answer) {
    static_cast<void>(!write(entry.answers.Number(), &answer, sizeof(answer)));
  }

  const Brokerage& brokerage;
  FileDescriptor socket;  // none when nobody can ask any more
  FileDescriptor children;
  sigset_t signalsBefore = {};
  std::vector<Entry> entries;
};

[[noreturn]] void BecomeBroker(const Brokerage& brokerage, FileDescriptor socket) {
  static_cast<void>(!chdir("/"));
  CloseStandardDescriptors();
  CloseInherited(brokerage.procDirectory);
  Broker(brokerage, std::move(socket)).Serve();
  _exit(0);
}

}  // namespace

FileDescriptor StartBroker(const Brokerage& brokerage) {
  int ends[2] = {};
  if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends) != 0) {
    ThrowErrno("cannot make a socket for a broker");
  }
  FileDescriptor here(ends[0]);
  FileDescriptor there(ends[1]);
  const int yes = 1;
  if (setsockopt(there.Number(), SOL_SOCKET, SO_PASSCRED, &yes, sizeof(yes)) != 0) {
    ThrowErrno("cannot make a socket for a broker");
  }
  // The program that this process becomes would not know a child.
  const pid_t between = fork();
  if (between < 0) ThrowErrno("cannot start a broker");
  if (between == 0) {
    here = {};
    const pid_t broker = fork();
    if (broker == 0) BecomeBroker(brokerage, std::move(there));
    _exit(broker < 0 ? errno : 0);
  }
  int status = 0;
  while (waitpid(between, &status, 0) < 0 && errno == EINTR) continue;
  errno = WIFEXITED(status) ? WEXITSTATUS(status) : EINTR;
  if (errno != 0) ThrowErrno("cannot start a broker");
  return here;
}

}  // namespace Enforce
