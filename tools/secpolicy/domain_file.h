#pragma once

#include <string>
#include <string_view>

namespace SecPolicyCli {

// The file that a load of the policy directory `policyDir` takes the domain's policy from.
std::string DomainFile(std::string_view domain, const std::string& policyDir);

}  // namespace SecPolicyCli
