#pragma once

#include <map>
#include <string>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/module/file_plan.h"
#include "policy/installed_policy.h"

namespace Enforce {

// The identifiers of domains by their names.
using DomainNumbers = std::map<std::string, unsigned int>;

// Adds to `files` which domain the programs with each label lead to from this one, and those of
// tardisks with it. One that is not among `domains` there is not, and nobody gets there.
void PlanTransitions(const Policy::InstalledDomain& domain, const LabelNumbers& labels,
                     const DomainNumbers& domains, ModuleFileRules& files);

// What becomes of the rules about transitions (-d), in order.
std::vector<RuleFate> TransitionFates(const Policy::InstalledDomain& domain);

}  // namespace Enforce
