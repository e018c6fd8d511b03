#pragma once

#include <nlohmann/json.hpp>
#include <string>

#include "installed_policy.h"

namespace SecPolicyCli {

// What docs/json.md calls a rule, a domain and a policy; of the policy without its schema.
nlohmann::ordered_json ToJson(const InstalledRule& rule);
nlohmann::ordered_json ToJson(const InstalledDomain& domain);
nlohmann::ordered_json ToJson(const InstalledPolicy& policy);

// The text of a JSON document. Bytes that are no UTF-8 are replaced, not refused.
std::string DumpJson(const nlohmann::ordered_json& json);

}  // namespace SecPolicyCli
