#include <unistd.h>

#include <algorithm>
#include <iostream>
#include <string>
#include <vector>

#include "bundle/bundle_decision.h"
#include "command_line.h"
#include "ending.h"
#include "enforce/domain_plan.h"
#include "host/linux/common/module_library.h"
#include "host/linux/kernel/module_publication.h"
#include "host/linux/operation/state_use.h"
#include "installed/installed_policy.h"
#include "json.h"
#include "module/module_status.h"
#include "refusal.h"
#include "root.h"
#include "text/format.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using Enforce::Fate;
using Enforce::RuleFate;

constexpr std::size_t kTitleWidth = 9;

// The kernel is the machine's, and so is what it keeps.
void RequireMachine() {
  if (!IsOfMachine()) {
    throw Refusal(
        "the module is a part of the machine's kernel, which keeps the policy of the machine "
        "itself, and none below another root or in another state");
  }
  if (geteuid() != 0) throw Refusal("only root may ask the kernel for that");
}

void RequireKernel() {
  const ModuleKernel kernel = ReadModuleKernel();
  if (kernel.runsPrograms.value_or(true)) return;
  throw Refusal("Linux " + kernel.release +
                " was started without bpf among its security modules (" + kernel.securityModules +
                "), and would run nothing of it: add lsm=" + kernel.securityModules +
                ",bpf to its command line, and start the machine anew");
}

// What becomes of the rules of all domains.
struct Coverage {
  std::size_t kept = 0;
  std::size_t narrowed = 0;
  std::vector<RuleFate> others;
};

void Count(RuleFate fate, Coverage& coverage) {
  if (fate.fate == Fate::kNotExpressible) return coverage.others.push_back(std::move(fate));
  ++coverage.kept;
  if (fate.fate == Fate::kNarrowed) ++coverage.narrowed;
}

Coverage CoverageOf(const Policy::InstalledPolicy& policy) {
  Coverage coverage;
  for (const Policy::InstalledDomain& domain : policy.domains) {
    for (RuleFate& fate : LinuxHost::ModuleLibrary().fates(domain)) {
      Count(std::move(fate), coverage);
    }
  }
  return coverage;
}

std::string Describe(const Coverage& coverage, std::size_t domains, bool isListed) {
  std::string text = "it keeps " + CountOf(coverage.kept, "rule") + " of " +
                     CountOf(domains, "domain") + " for every process";
  if (coverage.narrowed > 0) text += ", " + std::to_string(coverage.narrowed) + " of them narrowed";
  if (coverage.others.empty()) return text;
  text += "; not kept: " + CountOf(coverage.others.size(), "rule");
  return text + (isListed ? "" : ", which -v lists");
}

ExitCode Start(bool isListed) {
  RequireMachine();
  RequireKernel();
  if (LinuxHost::IsStateMissing()) return RefuseWithoutState("module start");
  const Enforce::ModuleFunctions& module = LinuxHost::ModuleLibrary();
  auto running = module.find();
  const bool isNew = running == nullptr;
  if (isNew) running = module.start();
  LinuxHost::BeginPublishing(*running);
  SecPolicy::TeskAccessInterfaceImpl access;
  const Policy::InstalledPolicy policy = ReadInstalledPolicy(access);
  const Coverage coverage = CoverageOf(policy);
  for (const RuleFate& fate : coverage.others) {
    if (isListed) std::cout << Visible(LineOf(fate)) << '\n';
  }
  Summarize("module start", std::string(isNew ? "the module runs: " : "the module ran already: ") +
                                Describe(coverage, policy.domains.size(), isListed));
  return kWell;
}

// Of those that the policy wants to be enforcing.
std::vector<std::string> EnforcingDomains() {
  std::vector<std::string> names;
  if (LinuxHost::IsStateMissing()) return names;
  SecPolicy::TeskAccessInterfaceImpl access;
  for (const Policy::InstalledDomain& domain : Policy::ListDomains(access)) {
    if (domain.level == Policy::Level::kEnforcing) names.push_back(domain.name);
  }
  return names;
}

std::size_t CountConfined(const Enforce::RunningModule& running) {
  if (LinuxHost::IsStateMissing()) return 0;
  SecPolicy::TeskAccessInterfaceImpl access;
  return SumOf(ReadKeptDomains(running, access)).processes;
}

ExitCode Stop(bool isForced) {
  RequireMachine();
  const Enforce::ModuleFunctions& module = LinuxHost::ModuleLibrary();
  const auto running = module.find();
  if (running == nullptr) {
    LinuxHost::EndPublishing();
    return Refuse("module stop", "the module does not run");
  }
  const std::vector<std::string> enforcing = EnforcingDomains();
  if (!enforcing.empty() && !isForced) {
    return Refuse("module stop", CountOf(enforcing.size(), "domain") +
                                     " of the policy must be enforcing: " + FirstOf(enforcing) +
                                     ". Give them another level first, or end that by --force");
  }
  const std::size_t confined = CountConfined(*running);
  module.stop();
  LinuxHost::EndPublishing();
  Summarize("module stop", "the module is stopped: the kernel refuses nothing any more to " +
                               Processes(confined) + " in domains");
  return kWell;
}

void WriteLine(const std::string& title, const std::string& text) {
  std::string padded = title;
  padded.resize(kTitleWidth, ' ');
  std::cout << padded << Visible(text) << '\n';
}

void WriteText(const ModuleStatus& status) {
  WriteLine("kernel", Describe(status.kernel));
  WriteLine("module", status.isRunning ? "runs" : "does not run");
  if (!status.isRunning) return;
  WriteLine("canary", status.isRefusing ? "refused" : "not refused");
  WriteLine("policy", status.isPublished ? "as it is installed" : "behind what is installed");
  WriteLine("domains", std::to_string(status.domains.size()));
  for (const KeptDomain& domain : status.domains)
    WriteLine("", domain.name + " " + TextOf(domain.level) + ": " + Describe(domain));
}

void WriteJson(const ModuleStatus& status) {
  Json json = {{"schema", "secpolicy.module/1"}};
  for (const auto& [name, value] : MembersOf(status)) json[name] = value;
  std::cout << json.Text();
}

std::string Conclude(const ModuleStatus& status) {
  if (!status.problem.empty()) return status.problem;
  if (!status.isRunning) return "the module does not run";
  if (!status.isRefusing) return "the kernel refuses nothing, as it does not run the programs";
  if (status.isPublished) return "the kernel keeps what is installed";
  return "the kernel keeps another policy than is installed. " + Call("module start") +
         " tells it anew";
}

ExitCode ShowStatus(const std::string& format) {
  RequireMachine();
  const ModuleStatus status = ReadModuleStatus();
  (format == "json" ? WriteJson : WriteText)(status);
  Summarize("module status", Conclude(status));
  return status.IsWell() ? kWell : kFailed;
}

Action DefineStart(Syntax& syntax) {
  const Option verbose = syntax.Verbose();
  return [verbose] { return Start(verbose.IsGiven()); };
}

Action DefineStop(Syntax& syntax) {
  const auto isForced = std::make_shared<bool>(false);
  syntax.AddFlag("--force", *isForced, "Although domains of the policy must be enforcing");
  return [isForced] { return Stop(*isForced); };
}

Action DefineStatus(Syntax& syntax) {
  const auto format = std::make_shared<std::string>();
  syntax.AddFormat(*format, "it", {"text", "json"});
  return [format] { return ShowStatus(*format); };
}

const Kind kStart = {
    "start", "Have the kernel keep the policy for every process",
    "Loads programs that the kernel runs at its security hooks, tries whether it does, and tells\n"
    "them what is installed; from then on each change of the policy is told them, too. Where they\n"
    "run already they are told all of it anew. -v lists the rules that they do not keep.\n"
    "\n"
    "Example:\n"
    "  secpolicy module start -v",
    DefineStart};

const Kind kStop = {
    "stop", "End what the kernel keeps",
    "Ends the programs, after which nobody is refused anything by them. Not while a domain of the\n"
    "policy is enforcing, unless --force is given.\n"
    "\n"
    "Example:\n"
    "  secpolicy module stop --force",
    DefineStop};

const Kind kShow = {
    "status", "Show whether the kernel keeps the policy",
    "Prints the kernel, whether the module runs, whether it refuses, which is tried anew, whether "
    "it\n"
    "was told what is installed, and for each domain the processes in it and how much was "
    "refused.\n"
    "Exit status: 0 the kernel keeps what is installed, 1 it does not.\n"
    "\n"
    "Examples:\n"
    "  secpolicy module status\n"
    "  secpolicy module status --format json | jq .domains",
    DefineStatus};

Action Define(Syntax& syntax) {
  const std::vector<Kind> kinds = {kStart, kStop, kShow};
  return syntax.AddKinds(kinds);
}

}  // namespace

const Verb kModule = {
    "module", "Have the kernel keep the policy for the whole machine",
    "On kernels with bpf among their security modules the policy can be kept for every process,\n"
    "whoever starts it. It acts on the machine itself, so --root is refused.\n"
    "\n"
    "Examples:\n"
    "  secpolicy module start      load the module, and tell it what is installed\n"
    "  secpolicy module status     does it refuse, whom, and was it told the latest?\n"
    "  secpolicy module stop       end it, if no domain is enforcing",
    Define};

}  // namespace SecPolicyCli
