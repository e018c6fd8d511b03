#pragma once

#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include "json.h"
#include "policy/difference.h"
#include "side.h"

namespace SecPolicyCli {

// A line of the file labels that differs; a label is empty where there is no such line.
struct LabelDifference {
  std::string path;
  std::string before;
  std::string after;
};

// How the policy `after` differs from `before`.
struct Comparison {
  std::string before;  // the names of the two
  std::string after;
  Policy::Difference difference;
  std::optional<std::vector<LabelDifference>> labels;  // nothing when they cannot be compared

  bool IsSame() const { return difference.IsEmpty() && (!labels || labels->empty()); }
};

// Compares the two. A directory is compared with a state without the transitions of tardisks.
Comparison Diff(Side before, Side after);

// For people: `-` and `+` lines under a heading for each domain, for objects and file labels.
// Nothing when there is no difference.
void WriteDiffText(const Comparison& diff, std::ostream& output);

// The same in numbers: a line for each domain, for objects and for file labels.
void WriteDiffStat(const Comparison& diff, std::ostream& output);

// "domain sshDom", and which side alone has it.
std::string TitleOf(const Policy::DomainDifference& domain, const Comparison& diff);

// For programs; see docs/json.md.
Json DiffToJson(const Comparison& diff);
void WriteDiffJson(const Comparison& diff, std::ostream& output);

}  // namespace SecPolicyCli
