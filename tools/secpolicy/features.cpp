#include "host/enforce/features.h"

#include <unistd.h>

#include <iostream>
#include <memory>
#include <string>

#include "command_line.h"
#include "ending.h"
#include "enforce/domain_plan.h"
#include "enforce/kept_domain.h"
#include "module/module_status.h"
#include "query/ask.h"
#include "query/named.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using Enforce::Features;

const char* TextOf(Enforce::Namespace mounts) {
  switch (mounts) {
    case Enforce::Namespace::kPrivileged:
      // Of others, below a root of their own.
      return geteuid() == 0 ? "as root" : "in a user namespace";
    case Enforce::Namespace::kUser:
      return "in a user namespace";
    case Enforce::Namespace::kNone:
      break;
  }
  return "no";
}

const char* TextOf(const ModuleKernel& kernel) {
  if (!kernel.runsPrograms) return "not known, as it does not tell its security modules";
  return *kernel.runsPrograms ? "yes" : "no, as bpf is not among its security modules";
}

std::string YesOrNo(bool isSo) { return isSo ? "yes" : "no"; }

void WriteFeatures(const Features& features) {
  std::cout << "Landlock: "
            << (features.landlock == 0 ? "no" : "version " + std::to_string(features.landlock))
            << "\nfilters of system calls: " << YesOrNo(features.seccomp)
            << "\nfilters that ask a supervisor: " << YesOrNo(features.notifies)
            << "\nmounts of one's own: " << TextOf(Enforce::ProbeMounts())
            << "\nmodule for the whole machine: " << TextOf(ReadModuleKernel()) << '\n';
}

Json ToJson(const Features& features) {
  Json module;
  if (const auto runs = ReadModuleKernel().runsPrograms) module = *runs;
  return {{"landlock", features.landlock},
          {"seccomp", features.seccomp},
          {"seccompNotify", features.notifies},
          {"mountNamespace", TextOf(Enforce::ProbeMounts())},
          {"module", module}};
}

ExitCode ShowFeatures(const std::string& format) {
  const Features features = Enforce::ProbeFeatures();
  if (format == "json") {
    std::cout << Json{{"schema", "secpolicy.features/1"}, {"features", ToJson(features)}}.Text();
  } else {
    WriteFeatures(features);
  }
  return kWell;
}

ExitCode ShowFates(const std::string& word, const std::string& format) {
  SecPolicy::TeskAccessInterfaceImpl access;
  const Policy::InstalledDomain domain = RequireInstalledDomain(word, access);
  const Keeper keeper = FindKeeper();
  TellWhyNot("features", keeper, domain.name);
  const Enforce::CompiledPlan compiled = PlanOf(domain, keeper, access);
  if (format == "json") {
    std::cout << Json{{"schema", "secpolicy.features/1"},
                      {"features", ToJson(Enforce::ProbeFeatures())},
                      {"domain", domain.name},
                      {"gaps", compiled.gaps},
                      {"rules", FatesToJson(compiled.fates)}}
                     .Text();
  } else {
    for (const std::string& line : LinesOf(compiled)) std::cout << Visible(line) << '\n';
  }
  if (keeper.module != nullptr)
    Summarize("features", "the module keeps " + domain.name +
                              " for every process in it, and 'run' and " +
                              "'exec' filter system calls besides");
  if (domain.rules.empty())
    Summarize("features", domain.name + " has no rules, so it is granted nothing");
  return KeepsAllRules(compiled) ? kWell : kFailed;
}

Action Define(Syntax& syntax) {
  const auto domain = std::make_shared<std::string>();
  syntax
      .AddOption("--for", *domain,
                 "What becomes of each rule of a domain, by its name or its number")
      .NameValue("DOMAIN");
  const auto format = AddAnswerFormat(syntax);
  return [=] {
    if (domain->empty()) return ShowFeatures(*format);
    return Ask("features", [=] { return ShowFates(*domain, *format); });
  };
}

}  // namespace

const Verb kFeatures = {
    "features", "Say what this kernel can enforce, and what becomes of each rule of a domain",
    "Without --for, lists what this kernel and this user have to confine programs by. With it, "
    "each\n"
    "rule of the domain is one of\n"
    "\n"
    "  enforced          exactly\n"
    "  narrowed          the domain may do less than the rule says, and how\n"
    "  notExpressible    it could do more, or could never do what the rule is for: 'secpolicy "
    "run'\n"
    "                    starts nothing then\n"
    "\n"
    "Exit status with --for: 0 all rules can be kept to, 1 some cannot.\n"
    "\n"
    "Examples:\n"
    "  secpolicy features\n"
    "  secpolicy features --for sshDom --format json",
    Define};

}  // namespace SecPolicyCli
