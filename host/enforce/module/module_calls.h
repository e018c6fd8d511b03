#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/module/map_entries.h"
#include "policy/installed_policy.h"

// Rules about system calls, and about flags and signals that they take, as the module keeps them.
namespace Enforce {

// Writes what the domain is granted into `rules`, of which nothing else is touched.
void PlanCallsOfModule(const Policy::InstalledDomain& domain, ModuleRules& rules);

// What becomes of the rules about system calls and of -p clone_flags, in order. The fate of
// -p kill_signal is that of any check.
std::vector<RuleFate> CallFatesByModule(const Policy::InstalledDomain& domain);

// What the module cannot refuse in the domain although no rule grants it, for LineOfGap().
std::vector<std::string> GapsByModule(const Policy::InstalledDomain& domain);

// The calls of which each use comes to a hook before it does anything, in ascending order.
std::vector<std::string_view> CallsAtHooks();

// For people: how many calls are granted, and which flags where not all are, a line for each.
std::string DumpCalls(const ModuleRules& rules);

}  // namespace Enforce
