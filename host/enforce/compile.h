#pragma once

#include <string>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/features.h"
#include "host/enforce/plan/path_plan.h"
#include "host/enforce/plan/plan.h"
#include "policy/installed_policy.h"

namespace Enforce {

// What a plan depends on beside the rules of its domain.
struct Surroundings {
  const Features& features;
  const std::vector<LabelledPath>& places;
  FileTree& files;
  // The domain is entered in a part of the machine's tree, out of which descriptors may lead.
  bool isBelowRoot = false;
};

struct CompiledPlan {
  Plan plan;
  std::vector<RuleFate> fates;    // of all rules of the domain, in order
  std::vector<std::string> gaps;  // why what no rule is about cannot be refused; none, as a rule
};

// The plan that confines a process to the domain by the means of this kernel. What these cannot
// refuse is told in the fates and gaps; it is for the caller to say whether a domain is entered
// then. Throws BraxoException for a rule whose words are no range.
CompiledPlan Compile(const Policy::InstalledDomain& domain, const Surroundings& surroundings);

// The plan for a domain that the module keeps, which `fates` tell of all its rules: nothing but a
// filter of system calls, of which not all come to the module.
CompiledPlan CompileBesideModule(const Policy::InstalledDomain& domain, std::vector<RuleFate> fates,
                                 const Features& features);

// The rules of a domain that cannot be kept to.
std::vector<RuleFate> NotExpressible(const std::vector<RuleFate>& fates);

// True where the domain can do no more than its rules say.
bool KeepsAllRules(const CompiledPlan& compiled);

// For people, a line each: what cannot be refused although no rule is about it, and then what
// becomes of the rules.
std::vector<std::string> CoverageOf(const CompiledPlan& compiled);

// The same plan for people: what the kernel is told, and then CoverageOf().
std::string Explain(const Policy::InstalledDomain& domain, const Surroundings& surroundings);
std::string ExplainBesideModule(const Policy::InstalledDomain& domain, std::vector<RuleFate> fates,
                                const Features& features);

}  // namespace Enforce
