#pragma once

#include <string>
#include <variant>
#include <vector>

#include "policy/parameter_range.h"
#include "policy/permissions.h"
#include "policy/rule_kind.h"
#include "teskctl/security.h"

namespace Policy {

// Where a rule was written.
struct Origin {
  std::string file;  // empty: no policy file brought it
  unsigned int line = 0;
  bool isGone = false;  // a load installed it, and the latest one has not found it in any file
};

// What a rule decides: whether it grants or, of a rule about a path, what it permits.
using Verdict = std::variant<bool, Permissions>;

// One rule of a domain.
struct Rule {
  RuleKind kind = {};
  std::vector<std::string> words = {};  // as written, between the keyword and the verdict
  Verdict verdict = {};
  unsigned int line = 0;  // that the access-control module was told
  Origin origin = {};     // for whoever knows it

  // True when it grants or permits anything.
  bool Grants() const;

  // What a rule about a path permits; only for those.
  const Permissions& Permits() const { return std::get<Permissions>(verdict); }

  // The values that a parameter check is about; only for those. Throws BraxoException for words
  // that are no range.
  ParameterRange Range() const;

  // The rule as a policy line, as it is displayed: "-a sshKey read grant".
  std::string Text() const;
};

// The rule of a record, which is one of the contract's eight. Throws BraxoException for letters
// that are no permissions.
template <class Record>
Rule ToRule(Record record);

// The record of a rule of its kind, of the domain. The identifier of the domain that a transition
// leads to is left at 0.
template <class Record>
Record ToRecord(Rule rule, unsigned int domainId, const std::string& domainName);

}  // namespace Policy
