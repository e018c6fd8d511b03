#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "enforce/entry.h"
#include "enforce/transition.h"
#include "query/ask.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Options {
  std::vector<std::string> command;
  EntryOptions entry;
};

ExitCode Exec(const Options& options) {
  const auto entry = [&](auto& access) { return EntryByExec(options.command, access); };
  return EnterDomain("exec", entry, options.entry);
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax.AddList("PROGRAM", options->command, "The program and its arguments, behind --").Require();
  AddEntryOptions(syntax, options->entry);
  return [=] {
    return Ask(
        "exec", [=] { return Exec(*options); }, kNotConfined);
  };
}

}  // namespace

const Verb kExec = {
    "exec", "Run a program in the domain that its label leads to",
    "Starts PROGRAM as the module of a kernel would at execve: the label of its file and the -d\n"
    "rules of the domain that this command runs in (hostDom, unless it was placed elsewhere) name\n"
    "the domain that it is started in. Without such a rule it stays in the same domain, which\n"
    "then has to be allowed to execute it. Otherwise as 'secpolicy run'.\n"
    "\n"
    "Examples:\n"
    "  secpolicy exec -- /usr/sbin/sshd\n"
    "  ExecStart=/usr/sbin/secpolicy exec -- /usr/sbin/sshd     in a unit of systemd",
    Define, PrepareEntry};

}  // namespace SecPolicyCli
