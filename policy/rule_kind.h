#pragma once

#include <array>
#include <cstddef>
#include <initializer_list>
#include <optional>
#include <span>
#include <string_view>

#include "teskctl/security.h"

// What a rule of each kind looks like. Whether one is right is for those to say who parse and
// install it.
namespace Policy {

// What a word stands for.
enum class WordKind {
  kLabel,
  kDomain,
  kObjectAccess,
  kCapability,
  kTransition,
  kFileKind,
  kParameterCheck,
  kSyscall,
  kSocketKind,
  kPath,
  kNumber,
};

struct WordForm {
  WordKind kind;
  const char* noun;       // what the access-control module calls it: "object access kind"
  const char* plainNoun;  // what it is called where people ask: "kind of access"
  std::optional<TeskCtl::Security::TeskAccess_KeywordType> table;  // that it has to be in
};

const WordForm& FormOf(WordKind kind);

// The form of the words of a table; null when there is no such table.
const WordForm* FindWordForm(TeskCtl::Security::TeskAccess_KeywordType table);

// The kinds of rules, in the order of their keywords. That is also the order in which the rules of
// a domain are shown.
enum class RuleKind {
  kObjectAccess,
  kCapability,
  kDomainTransition,
  kFileCreation,
  kParameterCheck,
  kFilePath,
  kSyscall,
  kUnixSocketCreation,
};

inline constexpr std::size_t kMaxRuleWords = 3;

struct RuleForm {
  RuleKind kind;
  const char* keyword;
  const char* name;  // states keep rules by it, so it stays
  const char* usage;
  std::initializer_list<WordKind> words;  // between the keyword and what the rule decides
  std::size_t optionalWords = 0;          // the last of them
  bool endsInGrant = true;                // false: in permissions, which may be missing
  const char* listTitle = nullptr;        // of several in one box; else each is drawn for itself

  std::span<const WordKind> Words() const { return {words.begin(), words.size()}; }
  std::size_t MinWords() const { return words.size() - optionalWords; }
};

// The forms of all kinds, in their order.
extern const std::array<RuleForm, 8> kRuleForms;

inline const RuleForm& FormOf(RuleKind kind) { return kRuleForms[static_cast<std::size_t>(kind)]; }

// The form of the rules with this keyword ("-a"); null when there is none.
const RuleForm* FindRuleForm(std::string_view keyword);

}  // namespace Policy
