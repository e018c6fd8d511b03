#include "host/enforce/module/transition_plan.h"

#include <map>
#include <string_view>

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

// By label, of the rules that lead elsewhere the first one, which all others give way to.
std::map<std::string_view, const Rule*> FirstByLabel(const InstalledDomain& domain) {
  std::map<std::string_view, const Rule*> first;
  for (const Rule* const rule : RulesOf(domain, RuleKind::kDomainTransition)) {
    if (LeadsOut(*rule, domain)) first.emplace(rule->words[0], rule);
  }
  return first;
}

}  // namespace

void PlanTransitions(const InstalledDomain& domain, const LabelNumbers& labels,
                     const DomainNumbers& domains, ModuleFileRules& files) {
  for (const auto& [name, rule] : FirstByLabel(domain)) {
    const auto label = labels.find(std::string(name));
    if (label == labels.end()) continue;
    const auto target = domains.find(rule->words[1]);
    const unsigned int next = target == domains.end() ? kModuleDomains + 1 : target->second;
    files.labels[label->second].next = next + 1;
  }
}

std::vector<RuleFate> TransitionFates(const InstalledDomain& domain) {
  const std::map<std::string_view, const Rule*> first = FirstByLabel(domain);
  std::vector<RuleFate> fates;
  for (const Rule* const rule : RulesOf(domain, RuleKind::kDomainTransition)) {
    RuleFate fate{.rule = *rule, .place = PlaceOf(*rule, domain.rules)};
    if (rule->Grants() && rule->words[2] != "exec")
      Narrow(fate, "only services of this host enter a domain this way");
    const auto chosen = first.find(rule->words[0]);
    if (LeadsOut(*rule, domain) && chosen->second->words[1] != rule->words[1])
      Narrow(fate,
             StrCat("what is labelled ", rule->words[0], " enters ", chosen->second->words[1]));
    fates.push_back(fate);
  }
  return fates;
}

}  // namespace Enforce
