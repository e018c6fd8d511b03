#pragma once

#include <string>

#include "host/enforce/plan/plan.h"

namespace Enforce {

// Reads the plan from a descriptor, when `source` is its number, or else from the file with this
// path, which may not be a link. Only a regular file counts that belongs to root or to this user
// and that nobody else may change. Refuses (refuse.h) everything else.
Plan ReadPlan(const std::string& source);

}  // namespace Enforce
