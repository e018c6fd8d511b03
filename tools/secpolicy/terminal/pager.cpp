#include "pager.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>
#include <sstream>
#include <tuple>
#include <utility>

#include "environment.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::WriteAll;

// In place of the pager.
void Copy() {
  std::array<char, 4096> piece{};
  ssize_t count = 0;
  while ((count = read(STDIN_FILENO, piece.data(), piece.size())) > 0) {
    if (!WriteAll(STDOUT_FILENO, {piece.data(), static_cast<std::size_t>(count)})) return;
  }
}

// A pager can start a shell, which whoever may only run this command as root should not get. And
// less shows colors only where it is told to.
std::vector<std::string> PagerEnvironment() {
  std::vector<std::string> variables = {"LESSSECURE=1"};
  if (getenv("LESS") == nullptr) variables.emplace_back("LESS=FRX");
  return EnvironmentWith(variables);
}

// Becomes the pager as soon as there is something to read.
[[noreturn]] void BecomePager(std::vector<std::string>& command, int input) {
  std::vector<std::string> environment = PagerEnvironment();
  pollfd text{.fd = input, .events = POLLIN, .revents = 0};
  while (poll(&text, 1, -1) < 0 && errno == EINTR) {
  }
  if ((text.revents & POLLIN) == 0) _exit(0);
  dup2(input, STDIN_FILENO);
  execvpe(command.front().c_str(), PointersTo(command).data(), PointersTo(environment).data());
  Copy();
  _exit(0);
}

}  // namespace

std::vector<std::string> PagerCommand() {
  const char* chosen = secure_getenv("SECPOLICY_PAGER");
  if (chosen == nullptr) chosen = secure_getenv("PAGER");
  if (chosen == nullptr) return {"less", "-FRX"};
  std::istringstream words(chosen);
  std::vector<std::string> command;
  for (std::string word; words >> word;) command.push_back(word);
  if (command == std::vector<std::string>{"cat"}) return {};
  return command;
}

Pager::Pager(std::vector<std::string> command, const TerminalSize& size) : terminal(size) {
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) LinuxHost::ThrowErrno("cannot make a pipe");
  const LinuxHost::Descriptor input(ends[0]);
  pipe = LinuxHost::Descriptor(ends[1]);
  child = fork();
  if (child < 0) LinuxHost::ThrowErrno("cannot fork");
  if (child != 0) return;
  pipe = LinuxHost::Descriptor(-1);
  BecomePager(command, input.Number());
}

Pager::~Pager() { End(); }

bool Pager::End() {
  if (state == State::kDone) return true;
  const bool wasShown = state == State::kPaging;
  state = State::kDone;
  pipe = LinuxHost::Descriptor(-1);
  while (waitpid(child, nullptr, 0) < 0 && errno == EINTR) {
  }
  return wasShown || WriteAll(STDOUT_FILENO, std::exchange(held, {}));
}

Pager::int_type Pager::overflow(int_type letter) {
  if (traits_type::eq_int_type(letter, traits_type::eof())) return traits_type::not_eof(letter);
  const char character = traits_type::to_char_type(letter);
  return xsputn(&character, 1) == 1 ? letter : traits_type::eof();
}

std::streamsize Pager::xsputn(const char* text, std::streamsize size) {
  const std::string_view shown(text, static_cast<std::size_t>(size));
  if (state == State::kDone) return WriteAll(STDOUT_FILENO, shown) ? size : 0;
  if (state == State::kPaging) {
    WriteAll(pipe.Number(), shown);
    return size;
  }
  held += shown;
  CountRows(shown);
  // One row is for the next prompt.
  if (rows >= terminal.rows) StartPaging();
  return size;
}

void Pager::CountRows(std::string_view text) {
  for (const char letter : text) {
    if (letter != '\n' && ++column <= terminal.columns) continue;
    ++rows;
    column = letter == '\n' ? 0 : 1;
  }
}

// The pager is who an interrupt is for now, and when it is left the rest is for nobody.
void Pager::StartPaging() {
  state = State::kPaging;
  std::ignore = signal(SIGINT, SIG_IGN);
  std::ignore = signal(SIGPIPE, SIG_IGN);
  WriteAll(pipe.Number(), std::exchange(held, {}));
}

}  // namespace SecPolicyCli
