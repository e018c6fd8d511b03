#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

// Where the policy was written: the kernel is told rules and labels, not the files that they come
// from, so who loads files records it beside them. An origin says nothing about what is installed
// now. Everything throws Braxo::Lib::BraxoException when the state cannot be used.
namespace LinuxHost {

struct RuleOrigin {
  std::string domain;
  std::string rule;  // as it is displayed: "-a sshKey read grant"
  std::string file;
  unsigned int line = 0;
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
void RecordOrigins(std::span<const RuleOrigin> rules, std::span<const LabelOrigin> labels);

// The origins of the rules of a domain, in no particular order.
std::vector<RuleOrigin> FindRuleOrigins(const std::string& domain);

// The line that labels the file at the absolute path `path`: of those for the path and for the
// trees around it, the one that was recorded last.
std::optional<LabelOrigin> FindLabelOrigin(const std::string& path);

}  // namespace LinuxHost
