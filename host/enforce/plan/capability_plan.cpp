#include "host/enforce/plan/capability_plan.h"

#include <optional>

#include "braxo/misc/strcat.h"
#include "policy/capability.h"
#include "policy/decision.h"

using Braxo::Misc::StrCat;
using Policy::Rule;

namespace Enforce {
namespace {

std::uint64_t BitOf(unsigned int number) { return std::uint64_t{1} << number; }

std::uint64_t BitOf(const Rule& rule) {
  const std::optional<unsigned int> number = Policy::CapabilityNumber(rule.words[0]);
  return number ? BitOf(*number) : 0;
}

// Those that one rule grants and none revokes.
std::uint64_t GrantedBy(const std::vector<const Rule*>& rules) {
  std::uint64_t granted = 0;
  std::uint64_t revoked = 0;
  for (const Rule* const rule : rules) (rule->Grants() ? granted : revoked) |= BitOf(*rule);
  return granted & ~revoked;
}

RuleFate FateOf(const Rule& rule, std::uint64_t lost, std::uint64_t known) {
  RuleFate fate{.rule = rule};
  const std::uint64_t bit = BitOf(rule);
  const bool isKnown = (bit & known) != 0;
  if (!rule.Grants() || (isKnown && (bit & lost) == 0)) return fate;
  Narrow(fate, StrCat(isKnown ? "this user has not " : "this kernel has no ", rule.words[0]));
  return fate;
}

}  // namespace

CapabilityPlan PlanCapabilities(const Policy::InstalledDomain& domain, std::uint64_t callers,
                                unsigned int last) {
  const std::vector<const Rule*> rules = RulesOf(domain, Policy::RuleKind::kCapability);
  const std::uint64_t granted = GrantedBy(rules);
  const std::uint64_t known = BitOf(last + 1) - 1;
  CapabilityPlan plan{granted & known & callers, {}};
  for (const Rule* const rule : rules) {
    plan.fates.push_back(FateOf(*rule, granted & ~plan.kept, known));
    plan.fates.back().place = PlaceOf(*rule, domain.rules);
  }
  return plan;
}

}  // namespace Enforce
