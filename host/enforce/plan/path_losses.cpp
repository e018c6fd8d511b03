#include "host/enforce/plan/path_losses.h"

#include <algorithm>
#include <utility>

namespace Enforce {
namespace {

using Policy::Rule;
using Policy::RuleKind;

bool GivesNewLabel(const Rule& rule) {
  return rule.kind == RuleKind::kFileCreation && rule.Grants() && rule.words[0] != rule.words[1];
}

}  // namespace

void PathLosses::Lose(const Region& region, Rights lost, const std::string& how, Fate fate) {
  if (lost == 0) return;
  Note(ofPaths[region.rule], {lost, fate, how});
  Note(ofLabels[region.label], {lost, fate, how});
}

RuleFate PathLosses::FateOf(const Rule& rule) const {
  const bool isWayIn = rule.kind == RuleKind::kDomainTransition && rule.Grants();
  if (isWayIn && rule.words[2] != "exec") {
    return {rule, Fate::kNarrowed, "only services of this host enter a domain this way"};
  }
  if (isWayIn) return {rule, Fate::kNarrowed, "only by \"secpolicy exec\""};
  RuleFate fate{rule, Fate::kEnforced, ""};
  const Rights granted = RightsOf(rule);
  for (const Loss& loss : LossesOf(rule)) {
    if ((loss.rights & granted) != 0 && loss.fate > fate.fate) fate = {rule, loss.fate, loss.how};
  }
  if (GivesNewLabel(rule)) {
    Narrow(fate, "what is made has the label of its directory, as the kernel gives none");
  }
  return fate;
}

void PathLosses::Note(std::vector<Loss>& losses, Loss loss) {
  for (const Loss& known : losses) {
    if (known.fate == loss.fate) loss.rights &= ~known.rights;
  }
  if (loss.rights != 0) losses.push_back(std::move(loss));
}

std::span<const PathLosses::Loss> PathLosses::LossesOf(const Rule& rule) const {
  if (rule.kind == RuleKind::kFilePath) {
    const auto found = ofPaths.find(&rule);
    return found == ofPaths.end() ? std::span<const Loss>() : found->second;
  }
  const auto found = ofLabels.find(std::string_view(rule.words[0]));
  return found == ofLabels.end() ? std::span<const Loss>() : found->second;
}

}  // namespace Enforce
