#pragma once

#include <ostream>
#include <string>
#include <vector>

#include "json.h"
#include "load_dry_run.h"
#include "policy/difference.h"

namespace SecPolicyCli {

// A rule of a domain.
struct DomainRule {
  std::string domain;
  Policy::Rule rule;
};

// A file and its labels by name.
struct FileLabelChange {
  std::string path;
  std::string before;
  std::string after;
};

// What a load would change. Everything is in ascending order.
struct LoadPlan {
  Policy::Difference difference;
  std::vector<FileLabelChange> labels;

  // What the load found in no file, and leaves: it is to keep it, or has errors, or worlds run.
  std::vector<std::string> stayingDomains;
  std::vector<DomainRule> stayingRules;

  bool ChangesNothing() const { return difference.IsEmpty() && labels.empty(); }
};

// The plan of the load that was run dry. Throws what the host throws.
LoadPlan MakeLoadPlan(const LoadDryRun& dryRun);

// Writes the plan for people: one thing a line under a heading for each kind of change. At most
// `maxLabels` files are shown.
void WritePlanText(const LoadPlan& plan, std::size_t maxLabels, std::ostream& output);

// Writes the plan for programs, with how the load of `policyDir` would end, and what is to be said
// of the bundle that it is of; null where it is of none.
void WritePlanJson(const LoadPlan& plan, const std::string& policyDir, const Json& bundle,
                   const LoadDryRun& dryRun, std::ostream& output);

}  // namespace SecPolicyCli
