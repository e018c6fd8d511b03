#pragma once

#include <vector>

#include "host/enforce/launcher/program.h"
#include "host/enforce/plan/plan.h"

namespace Enforce {

// Becomes the program, confined to what the plan lets its domain do; there is no way back. Of all
// descriptors it has the first three and `keptDescriptors`. A plan of another level than enforcing
// confines nothing. Refuses (refuse.h) and starts nothing when any step fails.
[[noreturn]] void Enter(Plan plan, const Program& program, std::vector<int> keptDescriptors);

// Becomes the program in the domain of the plan as the module keeps it, whatever its level; nothing
// but the filter of the plan is applied, which takes CAP_SYS_ADMIN. `module` is the descriptor of
// Module::EnteringMap(). Otherwise as Enter().
[[noreturn]] void EnterInModule(Plan plan, const Program& program, int module);

}  // namespace Enforce
