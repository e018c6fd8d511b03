#pragma once

#include <string>
#include <vector>

#include "host/enforce/coverage.h"
#include "policy/installed_policy.h"

namespace EnforceTest {

// The rule that a policy line says.
Policy::Rule RuleOf(const std::string& line);

// A domain with the rules that these lines say.
Policy::InstalledDomain DomainOf(const std::vector<std::string>& lines);

// "narrowed: -s ioctl grant (why)" of each rule that is not plainly enforced.
std::vector<std::string> Told(const std::vector<Enforce::RuleFate>& fates);

}  // namespace EnforceTest
