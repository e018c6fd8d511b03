#include "host/enforce/compile.h"

#include <linux/capability.h>

#include <algorithm>
#include <iterator>
#include <string_view>
#include <utility>

#include "braxo/misc/strcat.h"
#include "host/enforce/kernel.h"
#include "host/enforce/plan/call_plan.h"
#include "host/enforce/plan/capability_plan.h"
#include "host/enforce/plan/dump.h"
#include "host/enforce/plan/net_plan.h"
#include "policy/call_set.h"

using Braxo::Misc::StrCat;

namespace Enforce {
namespace {

using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;

// The first that can refuse to truncate files, without which what may not be written can be
// emptied, unless a filter refuses it.
constexpr int kTruncationVersion = 3;

constexpr Rights kReading = Landlock::kReadFile | Landlock::kReadDir;
constexpr Rights kWithoutWriting = kReading | Landlock::kExecute;

constexpr char kWithoutLandlock[] =
    "this kernel's Landlock cannot refuse what no rule grants (version 3 or newer can)";
constexpr char kWithoutSeccomp[] = "this kernel filters no system calls";

// Who has one of these takes a mask away, gets past it by a handle, or may list the empty place
// that is in its stead.
constexpr std::uint64_t kPastMasks =
    1U << CAP_SYS_ADMIN | 1U << CAP_DAC_READ_SEARCH | 1U << CAP_DAC_OVERRIDE;

bool IsAboutCalls(RuleKind kind) {
  return kind == RuleKind::kSyscall || kind == RuleKind::kParameterCheck;
}

bool IsAboutFiles(RuleKind kind) {
  return kind == RuleKind::kFilePath || kind == RuleKind::kObjectAccess ||
         kind == RuleKind::kFileCreation || kind == RuleKind::kUnixSocketCreation;
}

void GiveUp(RuleFate& fate, const char* reason) {
  fate.fate = Fate::kNotExpressible;
  fate.how = reason;
}

// Landlock lets signals through to what was started in the same entry alone.
void NarrowToScope(RuleFate& fate) {
  if (fate.rule.kind != RuleKind::kSyscall || !fate.rule.Grants()) return;
  if (!SpeaksOfSignals(fate.rule)) return;
  Narrow(fate, "signals reach only what was started with the same entry into the domain");
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

// True where those that it confines have somebody outside to ask, and can.
bool KeepsBroker(const InstalledDomain& domain, const std::vector<RuleFate>& fates) {
  const auto leadsElsewhere = [&](const RuleFate& fate) {
    return LeadsElsewhere(fate.rule, domain.name);
  };
  return domain.level == Policy::Level::kEnforcing && std::ranges::any_of(fates, leadsElsewhere) &&
         MayAskBroker(fates);
}

// A way into another domain is for those who are outside, too.
void TellOfBroker(const std::string& domain, std::vector<RuleFate>* fates) {
  if (MayAskBroker(*fates)) return;
  for (RuleFate& fate : *fates) {
    if (!LeadsElsewhere(fate.rule, domain)) continue;
    fate.how += " from outside of the domain, as asking from within takes -s pipe2 and sendmsg";
  }
}

// True where the right is to write to what can be emptied. Who may open for writing whatever has
// taken the place of a device since is to be one who may empty it, too.
bool WritesFile(const PathRight& right, FileTree& files) {
  constexpr Rights kEmptying = Landlock::kWriteFile | Landlock::kTruncate;
  if ((right.rights & ~kWithoutWriting) == 0) return false;
  return (right.rights & kEmptying) != kEmptying || files.KindOf(right.path) != FileKind::kSpecial;
}

// Landlock asks about truncation at every open, and does not stop on its way to the root before it
// is granted. So where no file may be written that is left to the filter, but for the call that it
// does not see through: who grants just that gets it.
Truncation TruncationOf(const PathPlan& paths, const InstalledDomain& domain,
                        const Surroundings& surroundings) {
  const bool writes = std::ranges::any_of(
      paths.rights, [&](const PathRight& right) { return WritesFile(right, surroundings.files); });
  if (writes || !surroundings.features.seccomp || IsCallNamed(domain, "openat2")) {
    return Truncation::kByLandlock;
  }
  return Truncation::kByFilter;
}

void TakeCalls(CallPlan& calls, Plan* plan) {
  plan->filter = std::move(calls.program);
  plan->secret = calls.secret;
  plan->mayEnd = calls.mayEnd;
  plan->mayMap = calls.mayMap;
}

struct Parts {
  PathPlan paths;
  Truncation truncation;
  CallPlan calls;
  CapabilityPlan capabilities;
  NetPlan net;
};

Parts PlanParts(const InstalledDomain& domain, const Surroundings& surroundings) {
  const Features& features = surroundings.features;
  CapabilityPlan capabilities = PlanCapabilities(
      domain, features.capabilities, static_cast<unsigned int>(features.lastCapability));
  const bool mayMask = (capabilities.kept & kPastMasks) == 0;
  PathPlan paths = PlanPaths(domain, surroundings.places, surroundings.files, mayMask);
  const Truncation truncation = TruncationOf(paths, domain, surroundings);
  return {.paths = std::move(paths),
          .truncation = truncation,
          .calls = PlanCalls(domain, truncation),
          .capabilities = std::move(capabilities),
          .net = PlanNet(domain, features.landlock)};
}

bool HasLandlock(const Features& features, Truncation truncation) {
  return features.landlock >= (truncation == Truncation::kByFilter ? 1 : kTruncationVersion);
}

bool IsScoped(const Features& features) { return features.landlock >= Kernel::kScopesVersion; }

std::vector<std::string> GapsOf(const Features& features, Truncation truncation) {
  std::vector<std::string> gaps;
  if (!HasLandlock(features, truncation)) gaps.emplace_back(kWithoutLandlock);
  if (!features.seccomp) gaps.emplace_back(kWithoutSeccomp);
  return gaps;
}

// In the order of the rules.
std::vector<RuleFate> TakeFates(Parts& parts, const Features& features) {
  std::vector<RuleFate> fates = std::move(parts.paths.fates);
  for (auto* const part : {&parts.calls.fates, &parts.capabilities.fates, &parts.net.fates}) {
    std::ranges::move(*part, std::back_inserter(fates));
  }
  std::ranges::sort(fates, {}, &RuleFate::place);
  for (RuleFate& fate : fates) {
    const RuleKind kind = fate.rule.kind;
    if (IsAboutFiles(kind) && !HasLandlock(features, parts.truncation))
      GiveUp(fate, kWithoutLandlock);
    if (IsAboutCalls(kind) && !features.seccomp) GiveUp(fate, kWithoutSeccomp);
    if (IsScoped(features)) NarrowToScope(fate);
  }
  return fates;
}

// What the root gives, all files give.
Rights RightsToAll(const PathPlan& paths) {
  Rights rights = 0;
  for (const PathRight& right : paths.rights) {
    if (right.path == "/") rights |= right.rights;
  }
  return rights;
}

// What Landlock is asked about. What all files may be read for it is not asked about at every open,
// unless some are within reach that have another root.
Rights HandledRights(const Parts& parts, const Surroundings& surroundings) {
  const Rights known = Landlock::AllRights(surroundings.features.landlock);
  if (parts.truncation == Truncation::kByLandlock) return known;
  const Rights unasked = surroundings.isBelowRoot ? 0 : RightsToAll(parts.paths) & kReading;
  return known & ~Landlock::kTruncate & ~unasked;
}

void TakeFiles(PathPlan& paths, Rights handled, Plan* plan) {
  plan->handledFiles = handled;
  for (PathRight& right : paths.rights) {
    right.rights &= handled;
    if (right.rights != 0) plan->paths.push_back(std::move(right));
  }
  plan->masks = std::move(paths.masks);
}

void TakePorts(NetPlan& net, Plan* plan) {
  plan->bindsChecked = net.bind.isHandled;
  plan->connectsChecked = net.connect.isHandled;
  plan->bindPorts = std::move(net.bind.ports);
  plan->connectPorts = std::move(net.connect.ports);
}

CompiledPlan Join(const InstalledDomain& domain, const Surroundings& surroundings, Parts parts) {
  const Features& features = surroundings.features;
  CompiledPlan compiled;
  compiled.fates = TakeFates(parts, features);
  TellOfBroker(domain.name, &compiled.fates);
  compiled.gaps = GapsOf(features, parts.truncation);
  Plan& plan = compiled.plan;
  plan.domain = domain.name;
  plan.domainId = domain.id;
  plan.level = domain.level;
  plan.keepsBroker = KeepsBroker(domain, compiled.fates);
  if (HasLandlock(features, parts.truncation)) {
    TakeFiles(parts.paths, HandledRights(parts, surroundings), &plan);
  }
  TakePorts(parts.net, &plan);
  plan.isScoped = IsScoped(features);
  plan.capabilities = parts.capabilities.kept;
  TakeCalls(parts.calls, &plan);
  return compiled;
}

// ---- Beside the module

// A filter stays with whoever goes on in another domain.
constexpr char kFilterStays[] = "what the filter of this domain refuses is refused there, too";

// Of calls the filter refuses all, and of their arguments more than the module.
void JoinFates(const InstalledDomain& domain, const std::vector<RuleFate>& ofFilter,
               std::vector<RuleFate>* fates) {
  for (const RuleFate& fate : ofFilter) {
    RuleFate& known = (*fates)[fate.place];
    if (fate.rule.kind == RuleKind::kSyscall) {
      known = fate;
    } else if (!fate.how.empty()) {
      Narrow(known, fate.how);
    }
  }
  for (RuleFate& fate : *fates) {
    if (LeadsElsewhere(fate.rule, domain.name)) Narrow(fate, kFilterStays);
  }
}

CompiledPlan JoinBesideModule(const InstalledDomain& domain, CallPlan calls,
                              std::vector<RuleFate> fates, const Features& features) {
  CompiledPlan compiled;
  compiled.plan.domain = domain.name;
  compiled.plan.domainId = domain.id;
  compiled.plan.level = domain.level;
  compiled.fates = std::move(fates);
  if (!features.seccomp) {
    compiled.gaps.emplace_back(kWithoutSeccomp);
    return compiled;
  }
  JoinFates(domain, calls.fates, &compiled.fates);
  TakeCalls(calls, &compiled.plan);
  return compiled;
}

std::string LinesOfCoverage(const CompiledPlan& compiled) {
  std::string text;
  for (const std::string& line : CoverageOf(compiled)) text += line + "\n";
  return text;
}

}  // namespace

CompiledPlan Compile(const InstalledDomain& domain, const Surroundings& surroundings) {
  return Join(domain, surroundings, PlanParts(domain, surroundings));
}

CompiledPlan CompileBesideModule(const InstalledDomain& domain, std::vector<RuleFate> fates,
                                 const Features& features) {
  return JoinBesideModule(domain, PlanCallsBesideModule(domain), std::move(fates), features);
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

std::vector<std::string> CoverageOf(const CompiledPlan& compiled) {
  std::vector<std::string> lines;
  for (const std::string& gap : compiled.gaps) lines.push_back(LineOfGap(gap));
  for (const RuleFate& fate : compiled.fates) lines.push_back(LineOf(fate));
  return lines;
}

std::string Explain(const InstalledDomain& domain, const Surroundings& surroundings) {
  Parts parts = PlanParts(domain, surroundings);
  const std::string text =
      Dump(parts.paths) + Dump(parts.net) + Dump(parts.capabilities) + Dump(parts.calls);
  return text + LinesOfCoverage(Join(domain, surroundings, std::move(parts)));
}

std::string ExplainBesideModule(const InstalledDomain& domain, std::vector<RuleFate> fates,
                                const Features& features) {
  CallPlan calls = PlanCallsBesideModule(domain);
  const std::string text = StrCat(
      "the module keeps the rules, and a filter all those about system calls\n", Dump(calls));
  return text +
         LinesOfCoverage(JoinBesideModule(domain, std::move(calls), std::move(fates), features));
}

}  // namespace Enforce
