#pragma once

#include <string>

namespace SecPolicyCli {

// Where the saved states lie. They outlive a boot.
inline constexpr char kSavedStatesDir[] = "/var/lib/secpolicy/saved";

// Why `name` cannot be the name of a saved state; empty when it can.
std::string WhyNoSavedName(const std::string& name);

// The file of the saved state `name`, which may not be there.
std::string SavedStatePath(const std::string& name);

}  // namespace SecPolicyCli
