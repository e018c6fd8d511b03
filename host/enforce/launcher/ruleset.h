#pragma once

#include "host/enforce/plan/plan.h"

namespace Enforce {

// Prepares what Landlock is to know of the plan, while its paths can still be opened. Returns the
// descriptor of the ruleset, closed on execution; -1 where the plan asks nothing of Landlock.
// Refuses (refuse.h) a plan that this kernel cannot enforce or that is not about these files any
// more.
int PrepareRuleset(const Plan& plan);

}  // namespace Enforce
