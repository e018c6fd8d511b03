#include "host/enforce/compile.h"

#include <algorithm>
#include <iterator>
#include <string_view>
#include <utility>

#include "host/enforce/plan/call_plan.h"
#include "host/enforce/plan/capability_plan.h"
#include "host/enforce/plan/dump.h"
#include "host/enforce/plan/net_plan.h"
#include "host/enforce/plan/port_check.h"
#include "policy/call_set.h"

namespace Enforce {
namespace {

using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;

// The first that can refuse to truncate files, without which what may not be written can be
// emptied.
constexpr int kNeededLandlock = 3;

constexpr char kWithoutLandlock[] =
    "this kernel's Landlock cannot refuse what no rule grants (version 3 or newer can)";
constexpr char kWithoutSeccomp[] = "this kernel filters no system calls";

// The fates of one plan, which are in the order of the domain's rules.
class FateList {
 public:
  explicit FateList(std::vector<RuleFate> list) : fates(std::move(list)) {}

  RuleFate Take() { return std::move(fates.at(next++)); }

 private:
  std::vector<RuleFate> fates;
  std::size_t next = 0;
};

bool IsAboutFiles(RuleKind kind) {
  return kind == RuleKind::kFilePath || kind == RuleKind::kObjectAccess ||
         kind == RuleKind::kFileCreation || kind == RuleKind::kUnixSocketCreation;
}

void GiveUp(RuleFate* fate, const char* reason) {
  fate->fate = Fate::kNotExpressible;
  fate->how = reason;
}

// Landlock lets signals through to what was started in the same entry alone.
RuleFate WithScope(RuleFate fate) {
  if (!fate.rule.Grants() || !SpeaksOfSignals(fate.rule)) return fate;
  fate.fate = std::max(fate.fate, Fate::kNarrowed);
  fate.how += fate.how.empty() ? "" : "; ";
  fate.how += "signals reach only what was started with the same entry into the domain";
  return fate;
}

// By which those that are confined ask their broker.
constexpr const char* kAskingCalls[] = {"pipe2", "sendmsg"};

bool LeadsElsewhere(const Rule& rule, const std::string& domain) {
  return rule.kind == RuleKind::kDomainTransition && rule.Grants() && rule.words[2] == "exec" &&
         rule.words[1] != domain;
}

bool IsCallGranted(const std::vector<RuleFate>& fates, std::string_view call) {
  bool isGranted = false;
  for (const RuleFate& fate : fates) {
    const bool isAsked =
        fate.rule.kind == RuleKind::kSyscall && Policy::SpeaksOfCall(fate.rule.words[0], call);
    if (isAsked && !fate.rule.Grants()) return false;
    isGranted = isGranted || isAsked;
  }
  return isGranted;
}

bool MayAskBroker(const std::vector<RuleFate>& fates) {
  return std::ranges::all_of(kAskingCalls,
                             [&](const char* call) { return IsCallGranted(fates, call); });
}

// A way into another domain is for those who are outside, too.
void TellOfBroker(const std::string& domain, std::vector<RuleFate>* fates) {
  if (MayAskBroker(*fates)) return;
  for (RuleFate& fate : *fates) {
    if (!LeadsElsewhere(fate.rule, domain)) continue;
    fate.how += " from outside of the domain, as asking from within takes -s pipe2 and sendmsg";
  }
}

struct Parts {
  PathPlan paths;
  CallPlan calls;
  CapabilityPlan capabilities;
  NetPlan net;
};

Parts PlanParts(const InstalledDomain& domain, const Surroundings& surroundings) {
  const Features& features = surroundings.features;
  return {.paths = PlanPaths(domain, surroundings.places, surroundings.files),
          .calls = PlanCalls(domain),
          .capabilities = PlanCapabilities(domain, features.capabilities,
                                           static_cast<unsigned int>(features.lastCapability)),
          .net = PlanNet(domain, features.landlock)};
}

}  // namespace

CompiledPlan Compile(const InstalledDomain& domain, const Surroundings& surroundings) {
  const Features& features = surroundings.features;
  const bool hasLandlock = features.landlock >= kNeededLandlock;
  auto [paths, calls, capabilities, net] = PlanParts(domain, surroundings);

  CompiledPlan compiled;
  Plan& plan = compiled.plan;
  plan.domain = domain.name;
  plan.domainId = domain.id;
  plan.level = domain.level;
  plan.handledFiles = hasLandlock ? Landlock::AllRights(features.landlock) : 0;
  for (PathRight& right : paths.rights) {
    right.rights &= plan.handledFiles;
    if (right.rights != 0) plan.paths.push_back(std::move(right));
  }
  plan.bindsChecked = net.bind.isHandled;
  plan.connectsChecked = net.connect.isHandled;
  plan.bindPorts = std::move(net.bind.ports);
  plan.connectPorts = std::move(net.connect.ports);
  plan.isScoped = features.landlock >= 6;
  plan.capabilities = capabilities.kept;
  plan.filter = std::move(calls.program);
  plan.secret = calls.secret;

  if (!hasLandlock) compiled.gaps.emplace_back(kWithoutLandlock);
  if (!features.seccomp) compiled.gaps.emplace_back(kWithoutSeccomp);

  FateList pathFates(std::move(paths.fates));
  FateList callFates(std::move(calls.fates));
  FateList capabilityFates(std::move(capabilities.fates));
  FateList netFates(std::move(net.fates));
  for (const Rule& rule : domain.rules) {
    RuleFate fate;
    if (rule.kind == RuleKind::kCapability) {
      fate = capabilityFates.Take();
    } else if (rule.kind == RuleKind::kSyscall) {
      fate = callFates.Take();
    } else if (rule.kind == RuleKind::kParameterCheck) {
      fate = IsPortCheck(rule.words[0]) ? netFates.Take() : callFates.Take();
    } else {
      fate = pathFates.Take();
    }
    const bool isAboutCalls =
        rule.kind == RuleKind::kSyscall || rule.kind == RuleKind::kParameterCheck;
    if (IsAboutFiles(rule.kind) && !hasLandlock) GiveUp(&fate, kWithoutLandlock);
    if (isAboutCalls && !features.seccomp) GiveUp(&fate, kWithoutSeccomp);
    if (rule.kind == RuleKind::kSyscall && plan.isScoped) fate = WithScope(std::move(fate));
    compiled.fates.push_back(std::move(fate));
  }
  TellOfBroker(domain.name, &compiled.fates);
  return compiled;
}

std::vector<RuleFate> NotExpressible(const std::vector<RuleFate>& fates) {
  std::vector<RuleFate> lost;
  std::ranges::copy_if(fates, std::back_inserter(lost),
                       [](const RuleFate& fate) { return fate.fate == Fate::kNotExpressible; });
  return lost;
}

bool KeepsAllRules(const CompiledPlan& compiled) {
  return compiled.gaps.empty() && NotExpressible(compiled.fates).empty();
}

bool KeepsBroker(const CompiledPlan& compiled) {
  const auto leadsElsewhere = [&](const RuleFate& fate) {
    return LeadsElsewhere(fate.rule, compiled.plan.domain);
  };
  return compiled.plan.level == Policy::Level::kEnforcing &&
         std::ranges::any_of(compiled.fates, leadsElsewhere) && MayAskBroker(compiled.fates);
}

std::string Explain(const InstalledDomain& domain, const Surroundings& surroundings) {
  const Parts parts = PlanParts(domain, surroundings);
  return Dump(parts.paths) + Dump(parts.net) + Dump(parts.capabilities) + Dump(parts.calls);
}

}  // namespace Enforce
