#include "host/enforce/launcher/ask.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "host/enforce/broker/message.h"
#include "host/enforce/launcher/number.h"
#include "host/enforce/launcher/refuse.h"

namespace Enforce {
namespace {

// The handler has no other way to know it.
int signalsEnd = -1;

int BrokerOfEnvironment() {
  const char* const text = std::getenv(kBrokerVariable);
  const auto number = text == nullptr ? std::nullopt : ReadNumber(text);
  if (number) return *number;
  Refuse(
      "there is no broker to ask: only 'secpolicy run' and 'exec' of an enforcing domain with an "
      "exec transition keep one");
}

// Something that can be neither read nor written in place of what the caller has closed.
void TakeClosedDescriptors() {
  int lowest = STDIN_FILENO;
  while (lowest >= 0 && lowest <= STDERR_FILENO) lowest = open("/", O_PATH);
  if (lowest >= 0) close(lowest);
}

int OpenPath(const char* path, const std::string& name) {
  const int opened = open(path, O_PATH);
  if (opened < 0) RefuseForErrno("cannot open " + name);
  return opened;
}

struct Pipe {
  int reading;
  int writing;
};

Pipe MakePipe() {
  int ends[2] = {};
  if (pipe2(ends, 0) != 0) RefuseForErrno("cannot make a pipe for the broker's answer");
  return {ends[0], ends[1]};
}

EntryRequest RequestOf(const Program& program) {
  EntryRequest request;
  for (char* const* word = program.arguments; *word != nullptr; ++word) {
    request.command.emplace_back(*word);
  }
  for (char* const* variable = program.environment; *variable != nullptr; ++variable) {
    if (MayBeHandedOn(*variable)) request.environment.emplace_back(*variable);
  }
  return request;
}

void Send(int broker, const std::string& bytes,
          const std::array<int, kEntryDescriptors>& descriptors) {
  iovec part = {const_cast<char*>(bytes.data()), bytes.size()};
  alignas(cmsghdr) char control[CMSG_SPACE(sizeof(descriptors))] = {};
  msghdr message = {};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  message.msg_control = control;
  message.msg_controllen = sizeof(control);
  cmsghdr* const rights = CMSG_FIRSTHDR(&message);
  rights->cmsg_level = SOL_SOCKET;
  rights->cmsg_type = SCM_RIGHTS;
  rights->cmsg_len = CMSG_LEN(sizeof(descriptors));
  std::memcpy(CMSG_DATA(rights), descriptors.data(), sizeof(descriptors));
  if (sendmsg(broker, &message, MSG_NOSIGNAL) < 0) {
    RefuseForErrno("cannot ask the broker of this domain");
  }
}

void HandOn(int signal, siginfo_t* info, void*) {
  // The terminal sends its own to all of them.
  if (info->si_code == SI_KERNEL) return;
  const int error = errno;
  const auto byte = static_cast<unsigned char>(signal);
  static_cast<void>(!write(signalsEnd, &byte, sizeof(byte)));
  errno = error;
}

void HandOnSignals(int end) {
  signalsEnd = end;
  struct sigaction action = {};
  action.sa_sigaction = HandOn;
  action.sa_flags = SA_SIGINFO | SA_RESTART;
  for (const int signal : kHandedOnSignals) sigaction(signal, &action, nullptr);
  static_cast<void>(std::signal(SIGPIPE, SIG_IGN));
}

EntryAnswer AwaitAnswer(int answers) {
  EntryAnswer answer;
  ssize_t size = 0;
  do {
    size = read(answers, &answer, sizeof(answer));
  } while (size < 0 && errno == EINTR);
  if (size == sizeof(answer)) return answer;
  Refuse("the broker of this domain has ended without an answer");
}

}  // namespace

bool IsKernelAsked() {
  const char* const broker = std::getenv(kBrokerVariable);
  return broker != nullptr && std::string_view(broker) == kKernelAsBroker;
}

void AskKernel(const Program& program) {
  Start(program, 0);
  RefuseForErrno("cannot execute " + program.path);
}

void AskBroker(const Program& program) {
  const int broker = BrokerOfEnvironment();
  TakeClosedDescriptors();
  const std::string bytes = Serialize(RequestOf(program));
  if (bytes.size() > kMostRequestBytes) {
    Refuse("the arguments of " + program.path + " are longer than a broker takes, 64 KiB");
  }
  const Pipe answers = MakePipe();
  const Pipe signals = MakePipe();
  Send(broker, bytes,
       {OpenPath(program.path.c_str(), program.path), OpenPath(".", "the working directory"),
        STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO, answers.writing, signals.reading});
  close(answers.writing);
  close(signals.reading);
  HandOnSignals(signals.writing);
  const EntryAnswer answer = AwaitAnswer(answers.reading);
  if (answer.kind == EntryAnswer::kEnded) _exit(static_cast<int>(answer.value));
  Refuse("the broker of this domain starts no " + program.path + ": " +
         std::strerror(static_cast<int>(answer.value)));
}

}  // namespace Enforce
