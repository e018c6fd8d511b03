#include "host/enforce/plan/net_plan.h"

#include <utility>

#include "braxo/misc/strcat.h"
#include "host/enforce/plan/port_check.h"

using Braxo::Misc::StrCat;
using Policy::Rule;

namespace Enforce {
namespace {

constexpr int kFirstAbiWithPorts = 4;

// What becomes of all rules of one check.
struct Outcome {
  PortPlan plan;
  Fate ofGrants = Fate::kEnforced;
  Fate ofRevokes = Fate::kEnforced;
  std::string how;
};

Outcome NotExpressible(std::string how) {
  return {{}, Fate::kNotExpressible, Fate::kNotExpressible, std::move(how)};
}

PortPlan Handle(const PortCheck& check) {
  PortPlan plan{.isHandled = true, .ports = {}};
  for (const ValueRange& range : check.passing.Ranges()) {
    for (std::uint32_t port = range.first; port <= range.last; ++port) {
      plan.ports.push_back(static_cast<std::uint16_t>(port));
    }
  }
  return plan;
}

Outcome Settle(const PortCheck& check, int landlockAbi) {
  if (check.IsOpen()) return {};
  if (landlockAbi < kFirstAbiWithPorts) {
    return NotExpressible("Landlock of this kernel knows no ports, which it does from Linux 6.7");
  }
  if (check.passing.Count() > kMostPorts) {
    return NotExpressible(
        StrCat("Landlock is told each port: more than ", kMostPorts, " are too many"));
  }
  return {Handle(check), Fate::kNarrowed, Fate::kEnforced, "for TCP only"};
}

RuleFate FateOf(const Rule& rule, const Outcome& outcome) {
  const Fate fate = rule.Grants() ? outcome.ofGrants : outcome.ofRevokes;
  return {.rule = rule, .fate = fate, .how = fate == Fate::kEnforced ? "" : outcome.how};
}

}  // namespace

NetPlan PlanNet(const Policy::InstalledDomain& domain, int landlockAbi) {
  const Outcome bind = Settle(ReadPortCheck(domain, kBindPort), landlockAbi);
  const Outcome connect = Settle(ReadPortCheck(domain, kConnectPort), landlockAbi);
  NetPlan plan{bind.plan, connect.plan, {}};
  for (const Rule& rule : domain.rules) {
    if (rule.kind != Policy::RuleKind::kParameterCheck || !IsPortCheck(rule.words[0])) continue;
    plan.fates.push_back(FateOf(rule, rule.words[0] == kBindPort ? bind : connect));
    plan.fates.back().place = PlaceOf(rule, domain.rules);
  }
  return plan;
}

}  // namespace Enforce
