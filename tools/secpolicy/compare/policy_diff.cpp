#include "policy_diff.h"

#include <algorithm>
#include <set>

#include "scratch/scratch_state.h"

namespace SecPolicyCli {
namespace {

using Labels = std::map<std::string, std::string>;

std::string LabelOf(const Labels& labels, const std::string& path) {
  const auto found = labels.find(path);
  return found == labels.end() ? "" : found->second;
}

std::vector<LabelDifference> CompareLabels(const Labels& before, const Labels& after) {
  std::set<std::string> paths;
  for (const auto& [path, label] : before) paths.insert(path);
  for (const auto& [path, label] : after) paths.insert(path);
  std::vector<LabelDifference> differences;
  for (const std::string& path : paths) {
    LabelDifference difference{path, LabelOf(before, path), LabelOf(after, path)};
    if (difference.before != difference.after) differences.push_back(std::move(difference));
  }
  return differences;
}

// Takes the transitions that tardisks are launched by out of `policy`: the host's tardisks bring
// them, so no policy directory holds them. `access` knows which they are.
void DropTardiskTransitions(Policy::InstalledPolicy& policy,
                            SecPolicy::TeskAccessInterfaceImpl& access) {
  const std::vector<std::string> launchDomains = access.GetTardiskLaunchDomains();
  const std::string kind = access.GetTardiskExecEventKeyword();
  for (Policy::InstalledDomain& domain : policy.domains) {
    if (std::ranges::find(launchDomains, domain.name) == launchDomains.end()) continue;
    std::erase_if(domain.rules, [&](const Policy::Rule& rule) {
      return rule.kind == Policy::RuleKind::kDomainTransition && rule.words[2] == kind;
    });
  }
}

void DropTardisksOfBoth(Side& one, Side& other) {
  const ScratchState scratch(true);
  SecPolicy::TeskAccessInterfaceImpl access;
  DropTardiskTransitions(one.policy, access);
  DropTardiskTransitions(other.policy, access);
}

}  // namespace

Comparison Diff(Side before, Side after) {
  if (before.labels.has_value() != after.labels.has_value()) DropTardisksOfBoth(before, after);
  Comparison diff{.before = before.name,
                  .after = after.name,
                  .difference = Policy::Compare(before.policy, after.policy),
                  .labels = std::nullopt};
  if (before.labels && after.labels) diff.labels = CompareLabels(*before.labels, *after.labels);
  return diff;
}

}  // namespace SecPolicyCli
