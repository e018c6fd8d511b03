#include "host/enforce/module/module_plan.h"

#include <limits>

#include "braxo/misc/strcat.h"
#include "host/enforce/plan/capability_plan.h"
#include "policy/capability.h"

using Braxo::Misc::StrCat;
using Policy::InstalledDomain;

namespace Enforce {
namespace {

// The module takes no heed of who enters a domain: what a process has not it cannot use.
constexpr std::uint64_t kOfEverybody = std::numeric_limits<std::uint64_t>::max();

CapabilityPlan CapabilitiesOf(const InstalledDomain& domain, unsigned int last) {
  return PlanCapabilities(domain, kOfEverybody, last);
}

std::string NamesOf(std::uint64_t capabilities) {
  std::string names;
  unsigned int number = 0;
  for (const std::string_view name : Policy::Capabilities()) {
    if ((capabilities >> number++ & 1) != 0) names += StrCat(" ", name);
  }
  return names.empty() ? " none" : names;
}

}  // namespace

ModulePlan PlanModule(const std::vector<InstalledDomain>& domains, unsigned int lastCapability) {
  ModulePlan plan;
  for (const InstalledDomain& domain : domains) {
    plan.push_back({domain.id, domain.level, {CapabilitiesOf(domain, lastCapability).kept}});
  }
  return plan;
}

std::vector<RuleFate> FatesByModule(const InstalledDomain& domain, unsigned int lastCapability) {
  std::vector<RuleFate> fates;
  for (const Policy::Rule& rule : domain.rules) {
    fates.push_back({rule, Fate::kNotExpressible, "the module keeps rules about capabilities alone",
                     PlaceOf(rule, domain.rules)});
  }
  for (const RuleFate& fate : CapabilitiesOf(domain, lastCapability).fates) {
    fates[fate.place] = fate;
  }
  return fates;
}

std::string Dump(const ModulePlan& plan) {
  std::string text;
  for (const ModuleDomain& domain : plan) {
    text += StrCat("domain ", domain.id, " ", Policy::TextOf(domain.level), ":",
                   NamesOf(domain.rules.capabilities), "\n");
  }
  return text;
}

}  // namespace Enforce
