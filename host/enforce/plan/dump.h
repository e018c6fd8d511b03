#pragma once

#include <string>

#include "host/enforce/plan/call_plan.h"
#include "host/enforce/plan/capability_plan.h"
#include "host/enforce/plan/net_plan.h"
#include "host/enforce/plan/path_plan.h"

// Plans as people read them.
namespace Enforce {

// What the kernel is told.
std::string Dump(const CallPlan& plan);
std::string Dump(const CapabilityPlan& plan);
std::string Dump(const NetPlan& plan);
std::string Dump(const PathPlan& plan);

}  // namespace Enforce
