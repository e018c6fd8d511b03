#include "host/enforce/module/transition_plan.h"

#include <compare>
#include <map>
#include <string>
#include <string_view>

#include "braxo/misc/strcat.h"
#include "policy/decision.h"

using Braxo::Misc::StrCat;
using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;

namespace Enforce {
namespace {

// The kinds of transitions that the kernel makes: by the label of a program, and by that of the
// tardisk it came from.
constexpr std::string_view kExec = "exec";
constexpr std::string_view kTardiskExec = "tardisk_exec";

bool IsByExecution(const Rule& rule) {
  return rule.words[2] == kExec || rule.words[2] == kTardiskExec;
}

bool LeadsOut(const Rule& rule, const InstalledDomain& domain) {
  return rule.Grants() && IsByExecution(rule) && rule.words[1] != domain.name;
}

struct Subject {
  std::string_view label;
  std::string_view kind;

  auto operator<=>(const Subject&) const = default;
};

Subject SubjectOf(const Rule& rule) { return {rule.words[0], rule.words[2]}; }

// Of the rules that lead elsewhere the first one, which all others give way to.
std::map<Subject, const Rule*> FirstBySubject(const InstalledDomain& domain) {
  std::map<Subject, const Rule*> first;
  for (const Rule* const rule : RulesOf(domain, RuleKind::kDomainTransition)) {
    if (LeadsOut(*rule, domain)) first.emplace(SubjectOf(*rule), rule);
  }
  return first;
}

std::string TextOf(const Subject& subject) {
  return StrCat(subject.kind == kExec ? "what is labelled " : "what came from a tardisk labelled ",
                subject.label);
}

}  // namespace

void PlanTransitions(const InstalledDomain& domain, const LabelNumbers& labels,
                     const DomainNumbers& domains, ModuleFileRules& files) {
  for (const auto& [subject, rule] : FirstBySubject(domain)) {
    const auto label = labels.find(std::string(subject.label));
    if (label == labels.end()) continue;
    const auto target = domains.find(rule->words[1]);
    const unsigned int next = target == domains.end() ? kModuleDomains + 1 : target->second;
    ModuleLabelRules& of = files.labels[label->second];
    (subject.kind == kExec ? of.next : of.nextOfTardisk) = next + 1;
  }
}

std::vector<RuleFate> TransitionFates(const InstalledDomain& domain) {
  const auto first = FirstBySubject(domain);
  std::vector<RuleFate> fates;
  for (const Rule* const rule : RulesOf(domain, RuleKind::kDomainTransition)) {
    RuleFate fate{.rule = *rule, .place = PlaceOf(*rule, domain.rules)};
    if (rule->Grants() && !IsByExecution(*rule))
      Narrow(fate, "only services of this host enter a domain this way");
    const auto chosen = first.find(SubjectOf(*rule));
    if (LeadsOut(*rule, domain) && chosen->second->words[1] != rule->words[1])
      Narrow(fate, StrCat(TextOf(chosen->first), " enters ", chosen->second->words[1]));
    fates.push_back(fate);
  }
  return fates;
}

}  // namespace Enforce
