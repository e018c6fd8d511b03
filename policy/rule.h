#pragma once

#include <array>
#include <span>
#include <string>
#include <tuple>
#include <variant>

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

// "grant" or "revoke", or letters of "rwx", which may be none.
std::string TextOf(const Verdict& verdict);

// One rule of a domain.
struct Rule {
  RuleKind kind = {};
  // As written, between the keyword and the verdict. Empty are those that the kind does not have,
  // and a range's last value where it has but one.
  std::array<std::string, kMaxRuleWords> words = {};
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

  // The words without those that it does not have.
  std::span<const std::string> Words() const;

  // The rule as a policy line, as it is displayed: "-a sshKey read grant".
  std::string Text() const;
};

// Orders rules by what they are about: their kind and their words.
struct BySubject {
  bool operator()(const Rule& one, const Rule& other) const {
    return std::tie(one.kind, one.words) < std::tie(other.kind, other.words);
  }
};

// The rule of a record, which is one of the contract's eight; its words are moved out of it. Throws
// BraxoException for letters that are no permissions.
template <class Record>
Rule TakeRule(Record& record);

// Moves a rule into a record of its kind. The domain of the record stays as it is, and so does the
// identifier of the domain that a transition leads to.
template <class Record>
void MoveInto(Record& record, Rule& rule);

}  // namespace Policy
