#pragma once

#include "refusals/gathering.h"

namespace SecPolicyLog {

// Looks up which programs the process of a refusal and its parent have, as long as both are there;
// else the paths stay empty.
void AddProgramPaths(SecPolicyCli::GatheredRefusal& refusal);

}  // namespace SecPolicyLog
