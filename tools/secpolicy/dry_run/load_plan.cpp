#include "load_plan.h"

#include <iostream>
#include <map>
#include <sstream>

#include "host/linux/operation/state_use.h"
#include "installed/installed_policy.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::TeskAccessInterfaceImpl;

Policy::InstalledPolicy ReadState(const std::string& path) {
  const LinuxHost::UsedCopy state(path, LinuxHost::ShownStatePath());
  TeskAccessInterfaceImpl access;
  return ReadInstalledPolicy(access);
}

// What the load has found in no file, and left.
void FindStaying(const Policy::InstalledPolicy& after, LoadPlan& plan) {
  for (const Policy::InstalledDomain& domain : after.domains) {
    if (domain.isGone) plan.stayingDomains.push_back(domain.name);
    for (const Policy::Rule& rule : domain.rules) {
      if (rule.origin.isGone) plan.stayingRules.push_back({domain.name, rule});
    }
  }
}

using LabelNames = std::map<unsigned int, std::string>;

LabelNames LabelNamesOf(const Policy::InstalledPolicy& policy) {
  LabelNames names;
  for (const auto& [name, id] : policy.objects) names.emplace(id, name);
  return names;
}

// A label may have gone while files still carry its number.
std::string NameOf(unsigned int id, const LabelNames& names) {
  const auto found = names.find(id);
  return found == names.end() ? "#" + std::to_string(id) : found->second;
}

}  // namespace

LoadPlan MakeLoadPlan(const LoadDryRun& dryRun) {
  const Policy::InstalledPolicy before = ReadState(dryRun.StateBefore());
  const Policy::InstalledPolicy after = ReadState(dryRun.StateAfter());
  LoadPlan plan;
  plan.difference = Policy::Compare(before, after);
  const LabelNames oldNames = LabelNamesOf(before);
  const LabelNames newNames = LabelNamesOf(after);
  for (const auto& change : dryRun.Labels()) {
    if (!change.IsLasting()) continue;
    plan.labels.push_back(
        {change.path, NameOf(change.before, oldNames), NameOf(change.after, newNames)});
  }
  FindStaying(after, plan);
  return plan;
}

}  // namespace SecPolicyCli
