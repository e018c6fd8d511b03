#pragma once

#include <string>
#include <vector>

#include "installed/installed_policy.h"

namespace SecPolicyCli {

// A rule about the same thing that decides otherwise.
struct RuleChange {
  std::string before;
  std::string after;
};

// How a domain differs. A domain that is only on one side differs in its level and in all rules.
struct DomainDifference {
  std::string name;
  std::string levelBefore;  // empty: there is no such domain
  std::string levelAfter;   // the same
  std::vector<std::string> removed;
  std::vector<std::string> added;
  std::vector<RuleChange> changed;

  bool IsNew() const { return levelBefore.empty(); }
  bool IsGone() const { return levelAfter.empty(); }
};

// How one policy differs from another. Everything is in ascending order.
struct PolicyDifference {
  std::vector<DomainDifference> domains;  // those that differ
  std::vector<std::string> objectsRemoved;
  std::vector<std::string> objectsAdded;

  bool IsEmpty() const { return domains.empty() && objectsRemoved.empty() && objectsAdded.empty(); }
};

// Compares what domains, rules and objects say; their numbers and places do not count.
PolicyDifference Compare(const InstalledPolicy& before, const InstalledPolicy& after);

// What a rule is about, without what it decides: "-s bind" of "-s bind grant", "-r /etc" of
// "-r /etc rw".
std::string SubjectOf(const std::string& rule);

// What a rule decides: "grant", "rw"; may be empty.
std::string DecisionOf(const std::string& rule);

}  // namespace SecPolicyCli
