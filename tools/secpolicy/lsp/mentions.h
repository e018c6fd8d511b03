#pragma once

#include <optional>
#include <string>
#include <vector>

#include "live_policy.h"
#include "policy/rule_kind.h"
#include "text_document.h"
#include "words.h"

namespace SecPolicyCli {

// What a word of a policy stands for.
struct Symbol {
  Policy::WordKind kind;
  std::string name;

  bool operator==(const Symbol&) const = default;
};

// A word of a rule that stands for something.
struct Mention {
  PolicyFile file;
  unsigned int line = 0;
  Span span;  // in the line

  bool Declares() const { return file.role == FileRole::kObjectFile; }
};

// What the word stands for; nothing for keywords, numbers and what a rule decides. Where a label
// may stand, a domain may, too, unless there is an object of the name.
std::optional<Symbol> SymbolOf(LivePolicy& policy, const PlacedWord& word);

// Every word of the policy that stands for it, in the order of the files and their lines.
std::vector<Mention> FindMentions(LivePolicy& policy, const Symbol& symbol);

// The files that define a domain of this name: of early boot, too.
std::vector<std::string> FilesOfDomain(const LivePolicy& policy, const std::string& domain);

}  // namespace SecPolicyCli
