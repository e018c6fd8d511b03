#pragma once

#include "dot_graph.h"
#include "installed/installed_policy.h"

namespace SecPolicyCli {

// All domains and the transitions between them, with the object and the kind of each on its arrow.
DotGraph DrawDomains(const InstalledPolicy& policy);

// One domain with everything that its rules let it reach.
DotGraph DrawDomain(const InstalledDomain& domain, const InstalledPolicy& policy);

}  // namespace SecPolicyCli
