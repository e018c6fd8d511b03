#pragma once

#include <optional>
#include <string>
#include <vector>

#include "policy/installed_policy.h"
#include "secpolicy/secpolicy.h"

// What the state that this process works with holds, with where it was written. All throw what the
// host throws.
namespace SecPolicyCli {

struct InstalledTardisk {
  std::string path;
  std::string label;  // empty when it cannot be read
};

Policy::InstalledPolicy ReadInstalledPolicy(SecPolicy::TeskAccessInterfaceImpl& access);

// One domain; nothing when there is none.
std::optional<Policy::InstalledDomain> ReadInstalledDomain(
    const std::string& name, SecPolicy::TeskAccessInterfaceImpl& access);

// The tardisks of this root, in order of path.
std::vector<InstalledTardisk> ReadTardisks(SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
