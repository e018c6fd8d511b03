#include "tardisk_transitions.h"

#include <algorithm>

namespace SecPolicyCli {

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

}  // namespace SecPolicyCli
