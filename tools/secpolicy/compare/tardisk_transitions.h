#pragma once

#include "installed/installed_policy.h"

namespace SecPolicyCli {

// Takes the transitions that tardisks are launched by out of `policy`: the host's tardisks bring
// them, so no policy directory holds them. `access` knows which they are.
void DropTardiskTransitions(Policy::InstalledPolicy& policy,
                            SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
