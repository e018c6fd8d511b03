#include <exception>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "enforce/entry.h"
#include "enforce/launcher.h"
#include "enforce/transition.h"
#include "query/ask.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

constexpr char kName[] = "exec";

struct Options {
  std::vector<std::string> command;
  EntryOptions entry;
};

// From within a domain neither the state nor another domain is to be reached.
ExitCode AskOutside(const std::vector<std::string>& command) {
  try {
    AskBroker(command);
  } catch (const std::exception& failure) {
    std::cerr << "secpolicy: " << kName << ": " << Visible(failure.what())
              << "; nothing was started" << std::endl;
    return kNotConfined;
  }
}

ExitCode Exec(const Options& options) {
  const auto entry = [&](auto& access) { return EntryByExec(options.command, access); };
  return EnterDomain(kName, entry, options.entry);
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax.AddList("PROGRAM", options->command, "The program and its arguments, behind --").Require();
  AddEntryOptions(syntax, options->entry);
  return [=] {
    if (HasBroker()) return AskOutside(options->command);
    return Ask(
        kName, [=] { return Exec(*options); }, kNotConfined);
  };
}

}  // namespace

const Verb kExec = {
    kName, "Run a program in the domain that its label leads to",
    "Starts PROGRAM as the module of a kernel would at execve: the label of its file and the -d\n"
    "rules of the domain that this command runs in (hostDom, unless it was placed elsewhere) name\n"
    "the domain that it is started in. Without such a rule it stays in the same domain, which\n"
    "then has to be allowed to execute it. Otherwise as 'secpolicy run', the exit status too.\n"
    "From within an enforcing domain a broker outside is asked, which 'run' and 'exec' keep for\n"
    "domains with an exec transition; that takes '-s sendmsg grant' and '-s pipe2 grant'.\n"
    "\n"
    "Examples:\n"
    "  secpolicy exec -- /usr/sbin/sshd\n"
    "  ExecStart=/usr/bin/secpolicy exec -- /usr/sbin/sshd     in a unit of systemd",
    Define, PrepareEntry};

}  // namespace SecPolicyCli
