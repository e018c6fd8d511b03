#pragma once

#include <string>

#include "host/linux/operation/store_copy.h"
#include "installed/installed_policy.h"

namespace SecPolicyCli {

// Reads the state at `path` from a copy, since even reading leaves traces beside a state. Throws
// what the host throws when it cannot be copied, and std::runtime_error when the copy cannot be
// used.
Policy::InstalledPolicy ReadStateAt(const std::string& path, LinuxHost::CopyOf what);

}  // namespace SecPolicyCli
