#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

#include "policy/decision.h"

// What policy/decision.h says of all that can be asked of a domain, asked beforehand: who has these
// answers looks them up, and decides nothing.
namespace SecPolicyCli {

// What rules decide together.
struct Answer {
  bool granted = false;
  bool isOpen = false;             // as of a decision
  std::vector<std::size_t> rules;  // those that decided, by their places in the domain

  bool operator==(const Answer&) const = default;
};

// The answer for the numbers from `first` to `last`.
struct RangeAnswer {
  std::uint64_t first = 0;
  std::uint64_t last = 0;
  Answer answer;
};

using Answers = std::map<std::string, Answer>;  // by what is asked for

struct DomainAnswers {
  // By rule. Of one about a path, what it permits: a bit for each kind of file access, in the order
  // of FileAccess, and kMakes. Of one that alone answers the question with its words, 1 or 0.
  std::vector<unsigned int> ofRules;

  Answers calls;       // that rules speak of
  Answers entries;     // by domain
  Answers executions;  // by label, of those that transitions name
  // By the label of a directory and the kind of a file.
  std::map<std::pair<std::string, std::string>, Answer> creations;
  // Of the checks that rules speak of, in ascending order; of one whose value is a mask, for no bit
  // and for each alone: all of a mask have to be granted.
  std::map<std::string, std::vector<RangeAnswer>> checks;
};

// The bit of a rule about a path that permits to make files.
constexpr unsigned int kMakes = 1U << 6U;

// `calls` are the system calls that can be asked about.
DomainAnswers AnswersOf(const Policy::InstalledDomain& domain,
                        const std::vector<std::string>& calls);

// What the rule for the path of a file, or those for its label, say.
enum class Say { kNothing, kGrants, kRefuses };

struct Settled {
  bool granted = false;
  bool byPath = false;   // the rule for the path is of those that decide
  bool byLabel = false;  // those for the label are
};

// What comes of the two. `question` is about a file of any path, with any label.
Settled Settle(const Policy::FileQuestion& question, Say ofPath, Say ofLabel);
Settled Settle(const Policy::CreationQuestion& question, Say ofPath, Say ofLabel);

}  // namespace SecPolicyCli
