#pragma once

#include <vector>

#include "installed_policy.h"
#include "json.h"

namespace SecPolicyCli {

// What docs/json.md calls a rule, a domain, the domains and objects of a policy, and tardisks.
Json ToJson(const Policy::Rule& rule);
Json FactsToJson(const Policy::InstalledDomain& domain);  // a domain without its rules
Json ToJson(const Policy::InstalledDomain& domain);
Json ToJson(const Policy::InstalledPolicy& policy);
Json ToJson(const std::vector<InstalledTardisk>& tardisks);

}  // namespace SecPolicyCli
