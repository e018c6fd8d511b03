#include <poll.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "check/check_options.h"
#include "command_line.h"
#include "ending.h"
#include "lsp/framing.h"
#include "lsp/server.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

volatile std::sig_atomic_t isAskedToEnd = 0;

void AskToEnd(int /*signal*/) { isAskedToEnd = 1; }

// What asks the process to end ends the wait for a message: the scratch state is to be removed. An
// editor that is gone shows when it is written to.
void TakeSignals() {
  struct sigaction action {};
  action.sa_handler = AskToEnd;
  for (const int signal : {SIGINT, SIGTERM, SIGHUP}) sigaction(signal, &action, nullptr);
  action.sa_handler = SIG_IGN;
  sigaction(SIGPIPE, &action, nullptr);
}

bool IsMoreThere() {
  pollfd input{.fd = STDIN_FILENO, .events = POLLIN, .revents = 0};
  return poll(&input, 1, 0) > 0;
}

// False when there is nothing more to come.
bool Read(MessageBuffer& messages) {
  std::array<char, 65536> bytes;
  const ssize_t size = read(STDIN_FILENO, bytes.data(), bytes.size());
  if (size <= 0) return false;
  messages.Append({bytes.data(), static_cast<std::size_t>(size)});
  return true;
}

void Send(const Json& message) { std::cout << Frame(message.Line()) << std::flush; }

// An editor ends the server by a message; one that is gone has failed to.
ExitCode Serve(Workspace& workspace) {
  TakeSignals();
  Server server(workspace, Send);
  MessageBuffer messages;
  while (isAskedToEnd == 0 && std::cout.good() && Read(messages)) {
    while (const auto message = messages.Take()) {
      server.Receive(*message);
      if (const auto ending = server.Ending()) return *ending;
    }
    if (!IsMoreThere()) server.Update();
  }
  if (messages.HasBegun()) std::cerr << "secpolicy: lsp: the last message is not complete\n";
  return kFailed;
}

struct Options {
  bool fresh = false;
  std::vector<std::string> unwanted;
};

ExitCode Run(const Options& options) {
  try {
    Workspace workspace(options.fresh, options.unwanted);
    return Serve(workspace);
  } catch (const FramingError& failure) {
    return Refuse("lsp", failure.what());
  }
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  AddFresh(syntax, options->fresh);
  AddUnwantedCodes(syntax, options->unwanted);
  return [options] { return Run(*options); };
}

}  // namespace

const Verb kLsp = {
    "lsp", "Serve editors: problems, completion and more while a policy is written",
    "A server of the Language Server Protocol 3.17 on standard input and output, which an editor\n"
    "starts. It tells what 'secpolicy check' finds while a policy file is edited, with fixes,\n"
    "completes words, explains rules, finds and renames labels and domains in all files, and\n"
    "aligns columns. A file belongs to the policy that 'secpolicy check FILE' finds for it. "
    "Nothing\n"
    "is written: the editor saves files. docs/editors.md tells how to set editors up.\n"
    "\n"
    "Examples:\n"
    "  secpolicy lsp                      for policies that are edited where they are used\n"
    "  secpolicy --root ./r lsp --fresh   for those of another root, as if it was newly booted\n"
    "  secpolicy lsp --disable missing-path",
    Define};

}  // namespace SecPolicyCli
