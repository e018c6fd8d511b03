#pragma once

#include <string>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/plan/call_plan.h"
#include "host/enforce/plan/capability_plan.h"
#include "host/enforce/plan/net_plan.h"
#include "host/enforce/plan/path_plan.h"

// Plans as people read them.
namespace Enforce {

// What becomes of each rule, one a line: "narrowed: -c cap_chown grant (this user has not
// cap_chown)".
std::string Dump(const std::vector<RuleFate>& fates);

// What is allowed, and then what becomes of the rules.
std::string Dump(const CallPlan& plan);
std::string Dump(const CapabilityPlan& plan);
std::string Dump(const NetPlan& plan);
std::string Dump(const PathPlan& plan);

}  // namespace Enforce
