#pragma once

#include "dot_graph.h"
#include "policy/installed_policy.h"

namespace SecPolicyCli {

// All domains and the transitions between them, with the object and the kind of each on its arrow.
DotGraph DrawDomains(const Policy::InstalledPolicy& policy);

// One domain with everything that its rules let it reach.
DotGraph DrawDomain(const Policy::InstalledDomain& domain, const Policy::InstalledPolicy& policy);

}  // namespace SecPolicyCli
