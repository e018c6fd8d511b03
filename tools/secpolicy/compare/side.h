#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "host/linux/operation/rule_origins.h"
#include "installed/installed_policy.h"
#include "secpolicy/observed/policy_observer.h"

namespace SecPolicyCli {

// One of two policies that are compared.
struct Side {
  std::string name;  // as the user gave it
  Policy::InstalledPolicy policy;

  // Of a policy directory, what its lines label; nothing for a state, which keeps no such lines.
  std::optional<std::map<std::string, std::string>> labels;
  std::vector<LinuxHost::LabelOrigin> labelLines = {};  // the same, as they are written
};

// Reads what `name` means: a policy directory, when it has a slash; "installed"; or a saved state
// or, where there is none of that name, a policy directory. Nothing is changed, and nothing logged.
// `observer` is told of what is wrong with the files of a directory. Throws NoSuchPolicy,
// NothingInstalled and BadPolicy, and what the host throws.
Side ReadSide(const std::string& name, SecPolicy::PolicyObserver& observer);

}  // namespace SecPolicyCli
