#include "tardisk_transitions.h"

#include <algorithm>

#include "policy_difference.h"

namespace SecPolicyCli {

void DropTardiskTransitions(InstalledPolicy& policy, SecPolicy::TeskAccessInterfaceImpl& access) {
  const std::vector<std::string> launchDomains = access.GetTardiskLaunchDomains();
  const std::string ending = " " + access.GetTardiskExecEventKeyword();
  for (InstalledDomain& domain : policy.domains) {
    if (std::ranges::find(launchDomains, domain.name) == launchDomains.end()) continue;
    std::erase_if(domain.rules, [&](const InstalledRule& rule) {
      return rule.text.starts_with("-d ") && SubjectOf(rule.text).ends_with(ending);
    });
  }
}

}  // namespace SecPolicyCli
