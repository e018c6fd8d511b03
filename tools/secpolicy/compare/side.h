#pragma once

#include <map>
#include <optional>
#include <string>

#include "installed/installed_policy.h"

namespace SecPolicyCli {

// One of two policies that are compared.
struct Side {
  std::string name;  // as the user gave it
  Policy::InstalledPolicy policy;

  // Of a policy directory, what its lines label; nothing for a state, which keeps no such lines.
  std::optional<std::map<std::string, std::string>> labels;
};

// Reads what `name` means: a policy directory, when it has a slash; "installed"; or a saved state
// or, where there is none of that name, a policy directory. Nothing is changed, and nothing logged.
// Throws std::runtime_error when there is no such thing, and when it cannot be read or has errors.
Side ReadSide(const std::string& name);

}  // namespace SecPolicyCli
