#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "enforce/entry.h"
#include "enforce/kept_domain.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Options {
  std::string domain;
  std::vector<std::string> command;
  EntryOptions entry;
  bool explain = false;
};

ExitCode Explain(const std::string& domain) {
  SecPolicy::TeskAccessInterfaceImpl access;
  const Policy::InstalledDomain installed = RequireInstalledDomain(domain, access);
  const Keeper keeper = FindKeeper();
  TellWhyNot("run", keeper, installed.name);
  std::cout << ExplanationOf(installed, keeper, access);
  return kWell;
}

ExitCode Run(const Options& options) {
  if (options.explain) return Explain(options.domain);
  if (options.command.empty()) throw QuestionError("CMD is required, behind --");
  return EnterDomain("run", Entry{options.domain, options.command}, options.entry);
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax.AddOption("DOMAIN", options->domain, "The domain to run in, by its name or its number")
      .Require();
  syntax.AddList("CMD", options->command, "The program and its arguments, behind --");
  AddEntryOptions(syntax, options->entry);
  syntax.AddFlag("--explain", options->explain,
                 "Only show what the kernel would be told, and what becomes of each rule");
  return [=] {
    return Ask(
        "run", [=] { return Run(*options); }, kNotConfined);
  };
}

}  // namespace

const Verb kRun = {
    "run", "Run a program in a domain, with exactly the rights of its rules",
    "Starts CMD in the domain DOMAIN: this process, and all that it starts, may do what the\n"
    "installed rules of the domain grant, and nothing else. On the machine's own root, ordinary\n"
    "users enter by the plans that root's boot and load have left for them. A domain never\n"
    "gives rights that its user does not have. In a domain that is permissive nothing is refused,\n"
    "and what its rules would refuse is told once, on standard error and in the log; one that is\n"
    "disabled is only recorded. Where the kernel keeps the domain ('secpolicy module'), root's\n"
    "CMD is in it as every other process there, and only its system calls are filtered besides.\n"
    "What this kernel cannot refuse is told with file and line before anything starts, and\n"
    "nothing is started then; --best-effort starts it all the same.\n"
    "\n"
    "Exit status: that of CMD; 126 when it could not be confined, 127 when there is no such\n"
    "program, 2 for wrong usage.\n"
    "\n"
    "Examples:\n"
    "  secpolicy run sshDom -- /usr/sbin/sshd\n"
    "  secpolicy run appDom -- cat /etc/shadow     is it refused?\n"
    "  secpolicy run appDom --explain              what is the kernel told?",
    Define, PrepareEntry};

}  // namespace SecPolicyCli
