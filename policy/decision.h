#pragma once

#include <array>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "policy/installed_policy.h"

// How the rules of a domain decide; docs/queries.md says the same for people. Nothing is read: what
// there is to know of a file is told with the question.
namespace Policy {

// What may be done with a file that is there. The first three are each a permission, too.
enum class FileAccess { kRead, kWrite, kExecute, kList, kRemove, kTruncate };

// Whether something may be done with a file.
struct FileQuestion {
  FileAccess access = FileAccess::kRead;
  std::string path;             // as it resolves; as it is written where there is nothing
  std::string label;            // empty when it has none
  bool labelIsBuiltIn = false;  // such a label says nothing about what the file is for
};

// Whether a file or a socket may be made at a path.
struct CreationQuestion {
  RuleKind kind = RuleKind::kFileCreation;  // or kUnixSocketCreation
  std::string what;                         // "regular", "stream"
  std::string path;
  std::string directoryLabel;  // of the directory that it is made in; empty when it has none
  bool labelIsBuiltIn = false;
};

// Whether a domain may be entered.
struct EntryQuestion {
  std::string domain;
  std::vector<Rule> ways;  // by which other domains enter it
};

// Whether a number passes a parameter check.
struct ParameterQuestion {
  std::string check;
  std::string number;  // as in a rule
};

// Whether that is granted which rules of the kind with these words are about.
struct WordsQuestion {
  RuleKind kind = {};
  std::array<std::string, kMaxRuleWords> words = {};
};

using Question =
    std::variant<FileQuestion, CreationQuestion, EntryQuestion, ParameterQuestion, WordsQuestion>;

// A rule that has a say in a question.
struct Vote {
  Rule rule;
  std::optional<Rule> instead;  // of a rule that refuses: the one that would grant

  bool Grants() const { return !instead; }
};

struct Decision {
  bool granted = false;       // by the rules alone
  bool refuses = true;        // false where the level lets everything pass
  bool isOpen = false;        // granted by no rule: none grants a value of the check, or revokes it
  std::vector<Vote> votes;    // those that decided
  std::vector<Rule> missing;  // of which each would grant what no rule speaks of

  bool IsAllowed() const { return granted || !refuses; }
};

// Whether the domain may do what is asked. What no rule speaks of is refused, but for a parameter
// check of which the domain is granted no value; of rules that disagree the one that refuses
// counts. Throws BraxoException for a number that is none.
Decision Decide(const Question& question, const InstalledDomain& domain);

// The rules of one kind.
std::vector<const Rule*> RulesOf(const InstalledDomain& domain, RuleKind kind);

}  // namespace Policy
