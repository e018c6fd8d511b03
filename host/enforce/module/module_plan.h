#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/module/file_plan.h"
#include "host/enforce/module/map_entries.h"
#include "policy/installed_policy.h"

namespace Enforce {

// What the module is told of a domain.
struct ModuleDomain {
  unsigned int id = 0;
  Policy::Level level = Policy::Level::kEnforcing;
  ModuleRules rules = {};
  ModuleFileRules files = {};
};

using ModulePlan = std::vector<ModuleDomain>;

// What the module is told of these domains; all others there are not. `lastCapability` is the
// highest number that the kernel knows, less than 63. `labels` are the numbers of labels: no file
// has one that is not among them.
ModulePlan PlanModule(const std::vector<Policy::InstalledDomain>& domains,
                      unsigned int lastCapability, const LabelNumbers& labels = {});

// What becomes of the rules of a domain, in order, where the module alone keeps them.
std::vector<RuleFate> FatesByModule(const Policy::InstalledDomain& domain,
                                    unsigned int lastCapability);

// The word of a check, by its place in the map; empty when there is none.
std::string_view NameOfCheck(unsigned int check);

// The plan for people: a line for each domain, and one for each check that not all values pass, for
// each label and for each path.
std::string Dump(const ModulePlan& plan);

}  // namespace Enforce
