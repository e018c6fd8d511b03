#pragma once

#include <vector>

#include "installed_policy.h"
#include "json.h"

namespace SecPolicyCli {

// What docs/json.md calls a rule, a domain, tardisks and a policy; of the policy without its
// schema.
Json ToJson(const InstalledRule& rule);
Json ToJson(const InstalledDomain& domain);
Json ToJson(const std::vector<InstalledTardisk>& tardisks);
Json ToJson(const InstalledPolicy& policy);

}  // namespace SecPolicyCli
