#pragma once

#include <optional>
#include <string>
#include <vector>

#include "policy/installed_policy.h"

namespace Policy {

// A rule about the same thing that decides otherwise.
struct RuleChange {
  Rule before;
  Rule after;
};

// How a domain differs. A domain that is only on one side differs in its level and in all rules.
struct DomainDifference {
  std::string name;
  std::optional<Level> levelBefore;  // nothing: there is no such domain
  std::optional<Level> levelAfter;   // the same
  std::vector<Rule> removed;
  std::vector<Rule> added;
  std::vector<RuleChange> changed;

  bool IsNew() const { return !levelBefore; }
  bool IsGone() const { return !levelAfter; }
  bool IsEmpty() const {
    return levelBefore == levelAfter && removed.empty() && added.empty() && changed.empty();
  }
};

// How one policy differs from another. Everything is in ascending order; rules are in that of
// their kinds and words.
struct Difference {
  std::vector<DomainDifference> domains;  // those that differ
  std::vector<std::string> objectsRemoved;
  std::vector<std::string> objectsAdded;

  bool IsEmpty() const { return domains.empty() && objectsRemoved.empty() && objectsAdded.empty(); }
};

// Compares what domains, rules and objects say; their numbers and places do not count.
Difference Compare(const InstalledPolicy& before, const InstalledPolicy& after);

}  // namespace Policy
