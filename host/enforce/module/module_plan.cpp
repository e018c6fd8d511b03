#include "host/enforce/module/module_plan.h"

#include <sys/ioctl.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <limits>
#include <span>
#include <string_view>

#include "braxo/misc/strcat.h"
#include "host/enforce/module/module_calls.h"
#include "host/enforce/module/transition_plan.h"
#include "host/enforce/plan/capability_plan.h"
#include "host/enforce/plan/port_check.h"
#include "host/enforce/plan/value_set.h"
#include "policy/call_set.h"
#include "policy/capability.h"
#include "policy/decision.h"

using Braxo::Misc::StrCat;
using Policy::InstalledDomain;

namespace Enforce {
namespace {

// The module takes no heed of who enters a domain: what a process has not it cannot use.
constexpr std::uint64_t kOfEverybody = std::numeric_limits<std::uint64_t>::max();

// By their places in the map.
constexpr std::array<std::string_view, kModuleChecks> kChecks = {
    "socket_family", "socket_type", "prctl_option", "ioctl_request", "bind_port",
    "connect_port",  "set_uid",     "set_gid",      "kill_signal"};

CapabilityPlan CapabilitiesOf(const InstalledDomain& domain, unsigned int last) {
  return PlanCapabilities(domain, kOfEverybody, last);
}

std::string NamesOf(std::uint64_t capabilities) {
  std::string names;
  unsigned int number = 0;
  for (const std::string_view name : Policy::Capabilities()) {
    if ((capabilities >> number++ & 1) != 0) names += StrCat(" ", name);
  }
  return names.empty() ? " none" : names;
}

// What types into a terminal acts as whoever reads there. A range that happens to hold it does not
// grant it.
struct TypingRequest {
  std::uint32_t value;
  const char* name;
};
constexpr TypingRequest kTyping[] = {{TIOCSTI, "TIOCSTI"}, {TIOCLINUX, "TIOCLINUX"}};

ValueSet Single(std::uint32_t value) { return ValueSet({{value, value}}); }

ValueSet PassingIn(const InstalledDomain& domain, std::string_view check) {
  const auto rules = RulesOfCheck(domain.rules, check);
  ValueSet passing = PassingValues(rules);
  if (check != kChecks[kCheckIoctl]) return passing;
  for (const auto& [value, name] : kTyping) {
    if (!IsGrantedByItself(rules, value)) passing = passing.Without(Single(value));
  }
  return passing;
}

bool HasRoom(const ValueSet& passing) { return passing.Ranges().size() <= kMostModuleRanges; }

// What there is no room for does not pass.
ModuleCheck CheckOf(const ValueSet& passing) {
  ModuleCheck check = {};
  if (!HasRoom(passing) || passing.IsEmpty()) return check;
  for (const auto& [first, last] : passing.Ranges()) check.ranges[check.count++] = {first, last};
  const std::span ranges(check.ranges);
  std::ranges::fill(ranges.subspan(check.count), ranges[check.count - 1]);
  for (unsigned int value = 0; value < kSmallValues; ++value)
    check.small |= std::uint64_t{passing.Has(value)} << value;
  return check;
}

ModuleRules RulesOf(const InstalledDomain& domain, unsigned int last) {
  ModuleRules rules = {};
  rules.capabilities = CapabilitiesOf(domain, last).kept;
  rules.hasPaths = Policy::RulesOf(domain, Policy::RuleKind::kFilePath).empty() ? 0 : 1;
  for (std::size_t check = 0; check < kChecks.size(); ++check)
    rules.checks[check] = CheckOf(PassingIn(domain, kChecks[check]));
  PlanCallsOfModule(domain, rules);
  return rules;
}

// The fates of the rules about a check that is kept.
void TellFates(const InstalledDomain& domain, std::string_view check,
               std::vector<RuleFate>& fates) {
  const bool hasRoom = HasRoom(PassingIn(domain, check));
  for (const Policy::Rule* const rule : RulesOfCheck(domain.rules, check)) {
    RuleFate fate{.rule = *rule, .place = PlaceOf(*rule, domain.rules)};
    if (!hasRoom && rule->Grants()) {
      Narrow(fate, StrCat("refused, as ", check, " has more than ", int{kMostModuleRanges},
                          " ranges of values"));
    }
    fates[fate.place] = fate;
  }
}

// Whether the rule grants the request; where none grants any, all pass, and so to who grants the
// call.
bool GrantsRequest(const Policy::Rule& rule, std::uint32_t value, bool isOpen) {
  if (!rule.Grants()) return false;
  if (rule.kind == Policy::RuleKind::kSyscall)
    return isOpen && Policy::SpeaksOfCall(rule.words[0], "ioctl");
  const Policy::Rule* const one = &rule;
  return rule.kind == Policy::RuleKind::kParameterCheck && rule.words[0] == kChecks[kCheckIoctl] &&
         PassingValues({&one, 1}).Has(value);
}

void TellTyping(const InstalledDomain& domain, std::vector<RuleFate>& fates) {
  const auto rules = RulesOfCheck(domain.rules, kChecks[kCheckIoctl]);
  const bool isOpen = std::ranges::none_of(rules, &Policy::Rule::Grants);
  for (const auto& [value, name] : kTyping) {
    if (IsGrantedByItself(rules, value) || !PassingValues(rules).Has(value)) continue;
    for (RuleFate& fate : fates) {
      if (GrantsRequest(fate.rule, value, isOpen))
        Narrow(fate, StrCat(name, " is refused unless granted by itself"));
    }
  }
}

// What is refused beside rules for ports: where other addresses lead to them, or packets are
// written by the process itself.
bool IsAboutSocketsPastPorts(const Policy::Rule& rule) {
  constexpr std::uint32_t kFirstNewerFamily = 46;
  static const ValueSet families({{AF_PACKET, AF_PACKET},
                                  {AF_RDS, AF_RDS},
                                  {AF_PPPOX, AF_PPPOX},
                                  {AF_TIPC, AF_TIPC},
                                  {AF_RXRPC, AF_RXRPC},
                                  {AF_KCM, AF_KCM},
                                  {AF_XDP, AF_XDP},
                                  {kFirstNewerFamily, std::numeric_limits<std::uint32_t>::max()}});
  static const ValueSet types({{SOCK_RAW, SOCK_RAW}, {SOCK_SEQPACKET, SOCK_SEQPACKET}});
  const Policy::Rule* const one = &rule;
  const ValueSet values = PassingValues({&one, 1});
  if (rule.words[0] == kChecks[kCheckFamily]) return !values.Within(families).IsEmpty();
  return rule.words[0] == kChecks[kCheckType] && !values.Within(types).IsEmpty();
}

void TellSocketsPastPorts(const InstalledDomain& domain, std::vector<RuleFate>& fates) {
  if (ReadPortCheck(domain, kBindPort).IsOpen() && ReadPortCheck(domain, kConnectPort).IsOpen())
    return;
  for (RuleFate& fate : fates) {
    const bool isOfCheck = fate.rule.kind == Policy::RuleKind::kParameterCheck;
    if (isOfCheck && fate.rule.Grants() && IsAboutSocketsPastPorts(fate.rule))
      Narrow(fate, "sockets that go past rules for ports are refused");
  }
}

std::string TextOf(const ModuleCheck& check) {
  std::string text;
  for (const auto& [first, last] : std::span(check.ranges).first(check.count)) {
    text += StrCat(" ", first);
    if (first != last) text += StrCat("-", last);
  }
  return text.empty() ? " none" : text;
}

// As where no rule is about it.
bool IsOpen(const ModuleCheck& values, std::string_view check) {
  return TextOf(values) == TextOf(CheckOf(PassingIn({}, check)));
}

}  // namespace

ModulePlan PlanModule(const std::vector<InstalledDomain>& domains, unsigned int lastCapability,
                      const LabelNumbers& labels) {
  DomainNumbers numbers;
  for (const InstalledDomain& domain : domains) numbers[domain.name] = domain.id;
  ModulePlan plan;
  for (const InstalledDomain& domain : domains) {
    plan.push_back(
        {domain.id, domain.level, RulesOf(domain, lastCapability), PlanFiles(domain, labels)});
    PlanTransitions(domain, labels, numbers, plan.back().files);
  }
  return plan;
}

std::vector<RuleFate> FatesByModule(const InstalledDomain& domain, unsigned int lastCapability) {
  std::vector<RuleFate> fates;
  for (const Policy::Rule& rule : domain.rules) {
    fates.push_back({rule, Fate::kNotExpressible, "the module does not keep such rules",
                     PlaceOf(rule, domain.rules)});
  }
  for (const std::string_view check : kChecks) TellFates(domain, check, fates);
  TellSocketsPastPorts(domain, fates);
  for (const RuleFate& fate : CapabilitiesOf(domain, lastCapability).fates) {
    fates[fate.place] = fate;
  }
  for (const RuleFate& fate : FileFates(domain)) fates[fate.place] = fate;
  for (const RuleFate& fate : CallFatesByModule(domain)) fates[fate.place] = fate;
  for (const RuleFate& fate : TransitionFates(domain)) fates[fate.place] = fate;
  TellTyping(domain, fates);
  return fates;
}

std::string_view NameOfCheck(unsigned int check) {
  if (check == kCheckFlags) return Policy::kMaskCheck;
  return check < kChecks.size() ? kChecks[check] : std::string_view();
}

std::string Dump(const ModulePlan& plan) {
  std::string text;
  for (const ModuleDomain& domain : plan) {
    text += StrCat("domain ", domain.id, " ", Policy::TextOf(domain.level), ":",
                   NamesOf(domain.rules.capabilities), "\n");
    for (std::size_t check = 0; check < kChecks.size(); ++check) {
      const ModuleCheck& values = domain.rules.checks[check];
      if (!IsOpen(values, kChecks[check]))
        text += StrCat("  ", kChecks[check], ":", TextOf(values), "\n");
    }
    text += Dump(domain.files);
    text += DumpCalls(domain.rules);
  }
  return text;
}

}  // namespace Enforce
