#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "compare/policy_diff.h"
#include "host/enforce/coverage.h"
#include "host/enforce/features.h"
#include "host/linux/operation/rule_origins.h"
#include "policy/installed_policy.h"

namespace SecPolicyCli {

// What this kernel makes of the rules of one domain.
struct DomainCoverage {
  std::vector<Enforce::RuleFate> fates;  // of all its rules, in order
  std::vector<std::string> gaps;
};

struct Coverage {
  Enforce::Features features;
  std::vector<DomainCoverage> domains;  // in the order of the policy
};

// The words that the host's tables have, of every kind that has a table but labels.
using WordTables = std::map<Policy::WordKind, std::vector<std::string>>;

// All that a report is made from.
struct ReportSource {
  std::string title;
  std::string name;  // of the policy, as the user gave it
  Policy::InstalledPolicy policy;
  std::vector<LinuxHost::LabelOrigin> labels;  // the lines that give them, in their order
  WordTables words;
  std::vector<std::string> builtInLabels;
  std::optional<Coverage> coverage;  // of the installed policy alone
  std::string whyNoCoverage;         // empty when there is one
  std::optional<Comparison> against;
};

// Reads the policy that `name` means, as ReadSide() has it, and compares it with the one that
// `against` means, unless that is empty. Throws as ReadSide() does, and BadPolicy with other words.
ReportSource ReadReportSource(const std::string& name, const std::string& against);

}  // namespace SecPolicyCli
