#pragma once

#include <map>
#include <string>
#include <vector>

#include "observe/proposal.h"
#include "policy/permissions.h"

namespace SecPolicyCli {

// A proposed rule and why.
struct ProposedRule {
  Policy::Rule rule;
  std::string reason;
};

// The -r rules by which `domain` may do with the observed files what it may not yet, where `others`
// are the rules that it gets beside them. Files that carry a label of their own are left to these,
// as long as no path rule is in their way.
std::vector<ProposedRule> ProposePaths(const Observations& observations,
                                       const Policy::InstalledDomain& domain,
                                       const std::vector<ProposedRule>& others);

// True for a label that says what a file is for.
bool IsMeaningful(const std::string& label, bool isBuiltIn);

}  // namespace SecPolicyCli
