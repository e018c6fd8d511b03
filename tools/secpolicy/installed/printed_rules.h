#pragma once

#include <string>
#include <vector>

namespace SecPolicy {
class PolicyRules;
}

namespace SecPolicyCli {

// The rules of `rules` as its PrintRules writes them, one text for each. Nothing reaches standard
// output.
std::vector<std::string> PrintedRules(SecPolicy::PolicyRules& rules);

}  // namespace SecPolicyCli
