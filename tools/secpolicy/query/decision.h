#pragma once

#include <string>
#include <vector>

#include "installed/installed_policy.h"
#include "question.h"

// How the rules of a domain decide; docs/queries.md says the same for people.
namespace SecPolicyCli {

// A rule that has a say in a question.
struct Vote {
  InstalledRule rule;
  bool grants = false;
  std::string instead;  // of a rule that refuses: the one that would grant
};

struct Decision {
  bool granted = false;              // by the rules alone
  bool refuses = true;               // false where the level lets everything pass
  std::vector<Vote> votes;           // those that decided
  std::vector<std::string> missing;  // rules of which each would grant what no rule speaks of

  bool IsAllowed() const { return granted || !refuses; }
};

// Whether the domain may do what is asked.
Decision Decide(const Question& question, const InstalledDomain& domain,
                const InstalledPolicy& policy);

// The policy file in which rules of the domain are written.
std::string PolicyFileOf(const InstalledDomain& domain);

}  // namespace SecPolicyCli
