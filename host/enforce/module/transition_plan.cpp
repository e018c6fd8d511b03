#include "host/enforce/module/transition_plan.h"

#include <algorithm>

#include "braxo/misc/strcat.h"
#include "policy/decision.h"

using Braxo::Misc::StrCat;
using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;

namespace Enforce {
namespace {

bool LeadsOut(const Rule& rule, const InstalledDomain& domain) {
  return rule.Grants() && rule.words[2] == "exec" && rule.words[1] != domain.name;
}

// Of those that lead elsewhere by this label the first one, which all others give way to.
const Rule* FirstBy(const std::string& label, const InstalledDomain& domain) {
  const auto rules = RulesOf(domain, RuleKind::kDomainTransition);
  const auto first = std::ranges::find_if(
      rules, [&](const Rule* rule) { return rule->words[0] == label && LeadsOut(*rule, domain); });
  return first == rules.end() ? nullptr : *first;
}

RuleFate FateOf(const Rule& rule, const InstalledDomain& domain) {
  RuleFate fate{.rule = rule, .place = PlaceOf(rule, domain.rules)};
  if (rule.Grants() && rule.words[2] != "exec")
    Narrow(fate, "only services of this host enter a domain this way");
  if (!LeadsOut(rule, domain)) return fate;
  const Rule* const first = FirstBy(rule.words[0], domain);
  if (first->words[1] != rule.words[1])
    Narrow(fate, StrCat("what is labelled ", rule.words[0], " enters ", first->words[1]));
  return fate;
}

}  // namespace

void PlanTransitions(const InstalledDomain& domain, const LabelNumbers& labels,
                     const DomainNumbers& domains, ModuleFileRules& files) {
  for (const Rule* const rule : RulesOf(domain, RuleKind::kDomainTransition)) {
    const auto label = labels.find(rule->words[0]);
    if (label == labels.end() || rule != FirstBy(rule->words[0], domain)) continue;
    const auto target = domains.find(rule->words[1]);
    const unsigned int next = target == domains.end() ? kModuleDomains + 1 : target->second;
    files.labels[label->second].next = next + 1;
  }
}

std::vector<RuleFate> TransitionFates(const InstalledDomain& domain) {
  std::vector<RuleFate> fates;
  for (const Rule& rule : domain.rules) {
    if (rule.kind == RuleKind::kDomainTransition) fates.push_back(FateOf(rule, domain));
  }
  return fates;
}

}  // namespace Enforce
