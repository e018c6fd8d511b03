#pragma once

#include <string>

#include "installed/installed_policy.h"

namespace SecPolicyCli {

// Reads the state at `path` from a copy, since even reading leaves traces beside a state. Throws
// std::runtime_error when it cannot be copied, and what the host throws.
InstalledPolicy ReadStateAt(const std::string& path);

}  // namespace SecPolicyCli
