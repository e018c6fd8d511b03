#pragma once

#include <map>
#include <string>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/module/map_entries.h"
#include "policy/installed_policy.h"

namespace Enforce {

using LabelNumbers = std::map<std::string, unsigned int>;

// What the module is told of a domain's rules about files.
struct ModuleFileRules {
  std::map<__u32, ModuleLabelRules> labels;
  std::map<std::string, __u32> paths;  // kPath... of map_entries.h
};

// What it is told of this domain, where labels have these numbers.
ModuleFileRules PlanFiles(const Policy::InstalledDomain& domain, const LabelNumbers& labels);

// What becomes of the domain's rules about files (-a, -f, -r), in order.
std::vector<RuleFate> FileFates(const Policy::InstalledDomain& domain);

// The rules for people: a line for each label and for each path.
std::string Dump(const ModuleFileRules& rules);

}  // namespace Enforce
