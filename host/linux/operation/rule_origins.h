#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "host/linux/operation/policy_load.h"
#include "policy/rule.h"

// Where the policy was written: the kernel is told rules and labels, not the files that they come
// from, so who loads files records it beside them. An origin says nothing about what is installed
// now. Everything throws Braxo::Lib::BraxoException when the state cannot be used.
namespace LinuxHost {

class HostState;

// The load that installed a rule.
struct RuleSource {
  std::optional<LoadKind> kind;  // none: no load, but a service
  std::string directory;         // of the policy
  bool isCurrent = true;         // false: the latest load of the kind has not found it again
};

// A rule, with its origin, that is not written in the file of its domain.
struct RuleOrigin {
  std::string domain;
  Policy::Rule rule;
};

struct LabelOrigin {
  std::string path;
  bool isTree = false;  // with everything below the path
  std::string label;
  std::string file;
  unsigned int line = 0;
};

// Records origins, all or none. A later one of the same rule of a domain, and of the same path,
// takes the place of an earlier one.
void RecordOrigins(HostState& state, std::span<const RuleOrigin> rules,
                   std::span<const LabelOrigin> labels);

// Gives those of the domain's rules their file and line that have recorded ones.
void FindRuleOrigins(HostState& state, const std::string& domain, std::span<Policy::Rule> rules);

// The sources of all rules of the kind that the domain `id` has, in the order in which the rules
// are read.
std::vector<RuleSource> FindRuleSources(HostState& state, unsigned int id, Policy::RuleKind kind);

// The domains that the latest load of their kind has not found in any file, by name.
std::vector<std::string> FindDomainsWithoutFile(HostState& state);

// The line that labels the file at the absolute path `path`: of those for the path and for the
// trees around it, the one that was recorded last.
std::optional<LabelOrigin> FindLabelOrigin(HostState& state, const std::string& path);

// The lines that label files, in the order in which they were recorded.
std::vector<LabelOrigin> ListLabelOrigins(HostState& state);

}  // namespace LinuxHost
