#include "options.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>
#include <string_view>

#include "host/enforce/launcher/number.h"
#include "host/enforce/launcher/refuse.h"

namespace SecPolicyRun {
namespace {

using Enforce::Refuse;

constexpr std::string_view kHelp =
    "Usage: secpolicy-run --plan PLAN [--program FD] [--keep-fd FD]... -- COMMAND [ARGUMENT...]\n"
    "       secpolicy-run --plan PLAN --module FD [--program FD] -- COMMAND [ARGUMENT...]\n"
    "       secpolicy-run --ask -- COMMAND [ARGUMENT...]\n"
    "Starts a command, confined to what a plan lets its domain do. 'secpolicy run' makes the plan\n"
    "and starts this program.\n"
    "\n"
    "  --plan PLAN     the plan: a file, or the number of a descriptor\n"
    "  --program FD    execute what this descriptor stands for; COMMAND is only its name\n"
    "  --keep-fd FD    leave this descriptor open, beside the first three\n"
    "  --module FD     the domain is kept by the module, of which this is a map: enter it there, "
    "and\n"
    "                  only filter system calls\n"
    "  --ask           from within a domain: let its broker start the command in the domain that "
    "the\n"
    "                  label of its file leads to\n"
    "  --help          print this text\n"
    "  --version       print the version\n"
    "\n"
    "Exit status: 126 nothing was started, 127 there is no such command; else that of the "
    "command.\n";

constexpr std::string_view kVersion = "secpolicy-run " SECPOLICY_VERSION "\n";

[[noreturn]] void Print(std::string_view text) {
  const bool isWritten =
      write(STDOUT_FILENO, text.data(), text.size()) == static_cast<ssize_t>(text.size());
  if (!isWritten) Enforce::RefuseForErrno("cannot write to standard output");
  std::exit(0);
}

[[noreturn]] void RefuseUsage(const std::string& message) {
  Refuse(message + ". 'secpolicy-run --help' explains the usage");
}

// The words of the command line, from left to right.
class Words {
 public:
  explicit Words(char** all) : next(all) {}

  char** Rest() const { return next; }
  bool IsAtEnd() const { return *next == nullptr; }
  std::string Take() { return *next++; }

  std::string TakeValueOf(const std::string& option) {
    if (IsAtEnd()) RefuseUsage(option + " needs a value");
    return Take();
  }

  int TakeDescriptorOf(const std::string& option) {
    const std::string text = TakeValueOf(option);
    const std::optional<int> descriptor = Enforce::ReadNumber(text);
    if (!descriptor) RefuseUsage(option + " needs the number of a descriptor, not " + text);
    if (fcntl(*descriptor, F_GETFD) < 0)
      Refuse("descriptor " + text + " of " + option + " is not open");
    return *descriptor;
  }

 private:
  char** next;
};

void Take(const std::string& option, Words& words, Options* options) {
  if (option == "--help") Print(kHelp);
  if (option == "--version") Print(kVersion);
  if (option == "--ask") {
    options->asks = true;
  } else if (option == "--plan") {
    options->plan = words.TakeValueOf(option);
  } else if (option == "--program") {
    options->program = words.TakeDescriptorOf(option);
  } else if (option == "--module") {
    options->module = words.TakeDescriptorOf(option);
  } else if (option == "--keep-fd") {
    options->keptDescriptors.push_back(words.TakeDescriptorOf(option));
  } else {
    RefuseUsage("there is no option " + option + "; the command stands behind --");
  }
}

}  // namespace

Options ReadOptions(char** arguments) {
  Options options;
  Words words(arguments + (*arguments == nullptr ? 0 : 1));
  bool isAtCommand = false;
  while (!isAtCommand && !words.IsAtEnd()) {
    const std::string word = words.Take();
    isAtCommand = word == "--";
    if (!isAtCommand) Take(word, words, &options);
  }
  const bool isToEnter = !options.plan.empty() || options.program ||
                         !options.keptDescriptors.empty() || options.module;
  if (options.asks && isToEnter) RefuseUsage("--ask takes no other option");
  if (options.module && !options.keptDescriptors.empty()) {
    RefuseUsage("--module takes no --keep-fd");
  }
  if (!options.asks && options.plan.empty()) RefuseUsage("no plan is named");
  if (words.IsAtEnd()) RefuseUsage("no command is named");
  options.command = words.Rest();
  return options;
}

}  // namespace SecPolicyRun
