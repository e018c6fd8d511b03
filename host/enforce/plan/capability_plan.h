#pragma once

#include <cstdint>
#include <vector>

#include "host/enforce/coverage.h"
#include "policy/installed_policy.h"

namespace Enforce {

struct CapabilityPlan {
  std::uint64_t kept = 0;       // a bit for each capability, by Linux's numbers; all others go
  std::vector<RuleFate> fates;  // of the rules about capabilities, in order
};

// The plan for a domain's rules about capabilities (-c). `callers` are those that whoever enters
// the domain may have, by the same bits; `last` is the highest number that the kernel knows, less
// than 63.
CapabilityPlan PlanCapabilities(const Policy::InstalledDomain& domain, std::uint64_t callers,
                                unsigned int last);

}  // namespace Enforce
