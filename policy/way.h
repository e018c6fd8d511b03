#pragma once

#include <optional>
#include <string>
#include <vector>

#include "policy/installed_policy.h"

namespace Policy {

// A transition from one domain into the next.
struct Step {
  std::string from;
  Rule rule;  // that grants it

  const std::string& To() const { return rule.words[1]; }
};

// The transitions that lead from the domain `from` into the domain `to`, as few as there can be:
// none where that is the same one. Nothing when no transitions lead there.
std::optional<std::vector<Step>> FindWay(const InstalledPolicy& policy, const std::string& from,
                                         const std::string& to);

}  // namespace Policy
