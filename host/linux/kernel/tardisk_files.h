#pragma once

#include "host/enforce/module/entry_point.h"
#include "host/linux/state/host_state.h"
#include "policy/installed_policy.h"

namespace LinuxHost {

// The files from tardisks whose labels lead any of the domains to another one.
Enforce::TardiskFiles ReadTardiskFiles(HostState& state, const Policy::InstalledPolicy& policy);

}  // namespace LinuxHost
