#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "host/enforce/compile.h"
#include "host/enforce/label_index.h"
#include "host/enforce/real_file_tree.h"
#include "json.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

using LabelNames = std::map<std::uint32_t, std::string>;

// What plans are made from beside the rules of their domains: the labels of all files, from the
// label index, and what can enforce them. Throws what the host throws.
class PlanSources {
 public:
  PlanSources(SecPolicy::TeskAccessInterfaceImpl& access, const Enforce::Features& kernelFeatures);
  PlanSources(const PlanSources&) = delete;
  PlanSources& operator=(const PlanSources&) = delete;

  // The plan of the domain, and the same for people.
  Enforce::CompiledPlan Compile(const Policy::InstalledDomain& domain);
  std::string Explain(const Policy::InstalledDomain& domain);

 private:
  Enforce::Surroundings All();

  const Enforce::Features features;
  const Enforce::LabelIndex index;
  const LabelNames names;
  std::vector<Enforce::LabelledPath> places;  // of the index, with the names of the labels
  Enforce::RealFileTree files;
};

// The plan of an installed domain on this kernel, from the label index. Throws what the host
// throws.
Enforce::CompiledPlan PlanOf(const Policy::InstalledDomain& domain,
                             SecPolicy::TeskAccessInterfaceImpl& access);

// The same plan, for people.
std::string ExplanationOf(Policy::InstalledDomain domain,
                          SecPolicy::TeskAccessInterfaceImpl& access);

// The fate with the file of its rule by the name that it has outside of the root, for people.
Enforce::RuleFate NamedOutside(Enforce::RuleFate fate);

// CoverageOf() with these names.
std::vector<std::string> LinesOf(Enforce::CompiledPlan compiled);

Json FatesToJson(const std::vector<Enforce::RuleFate>& fates);

}  // namespace SecPolicyCli
