#include "sentence.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "policy/call_set.h"
#include "policy/rule_kind.h"
#include "text/format.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

using Policy::RuleKind;
using Words = std::vector<PlacedWord>;

std::string Quoted(std::string_view word) { return "`" + Visible(word) + "`"; }

// A rule of a domain, taken apart.
struct Rule {
  std::string domain;  // in quotes, as are the words
  std::vector<std::string> words;
  std::string verdict;

  bool Grants() const { return verdict == "grant"; }
  const char* May() const { return Grants() ? " may " : " may not "; }
};

std::string ExplainAccess(const Rule& rule) {
  return rule.domain + rule.May() + rule.words[1] + " what carries the label " + rule.words[0] +
         ".";
}

std::string ExplainCapability(const Rule& rule) {
  return rule.domain + (rule.Grants() ? " holds" : " does not hold") + " the capability " +
         rule.words[0] + ".";
}

std::string ExplainTransition(const Rule& rule) {
  return "By " + rule.words[2] + " of something with the label " + rule.words[0] + ", " +
         rule.domain + (rule.Grants() ? " goes" : " does not go") + " over into the domain " +
         rule.words[1] + ".";
}

std::string ExplainCreation(const Rule& rule) {
  return "In a directory with the label " + rule.words[0] + ", " + rule.domain + rule.May() +
         "create files of the kind " + rule.words[2] + " with the label " + rule.words[1] + ".";
}

std::string ExplainCheck(const Rule& rule) {
  const std::string numbers = rule.words.size() == 2
                                  ? rule.words[1]
                                  : "every number from " + rule.words[1] + " to " + rule.words[2];
  return rule.domain + (rule.Grants() ? " passes" : " does not pass") + " the check " +
         rule.words[0] + " with " + numbers + ".";
}

std::string ExplainPath(const Rule& rule) {
  struct Letter {
    char letter;
    const char* action;
  };
  constexpr std::array<Letter, 3> kLetters = {{{'r', "read"}, {'w', "write"}, {'x', "execute"}}};
  std::vector<std::string> actions;
  for (const auto& [letter, action] : kLetters) {
    if (rule.verdict.find(letter) != std::string::npos) actions.emplace_back(action);
  }
  std::string list = actions.empty() ? "not use" : actions.front();
  for (std::size_t i = 1; i < actions.size(); ++i) {
    list += (i + 1 == actions.size() ? " and " : ", ") + actions[i];
  }
  return rule.domain + " may " + list + " " + rule.words[0] + " and what is beneath it.";
}

std::string ExplainCall(const Rule& rule, const Policy::CallSet* set) {
  if (set == nullptr)
    return rule.domain + rule.May() + "make the system call " + rule.words[0] + ".";
  return rule.domain + rule.May() + "make the " + CountOf(set->members.size(), "system call") +
         " of " + rule.words[0] + ".";
}

std::string ExplainSocket(const Rule& rule) {
  return rule.domain + rule.May() + "create sockets of the kind " + rule.words[1] +
         " with the label " + rule.words[0] + ".";
}

std::string ExplainRule(RuleKind kind, const Rule& rule, const Policy::CallSet* set) {
  switch (kind) {
    case RuleKind::kObjectAccess:
      return ExplainAccess(rule);
    case RuleKind::kCapability:
      return ExplainCapability(rule);
    case RuleKind::kDomainTransition:
      return ExplainTransition(rule);
    case RuleKind::kFileCreation:
      return ExplainCreation(rule);
    case RuleKind::kParameterCheck:
      return ExplainCheck(rule);
    case RuleKind::kFilePath:
      return ExplainPath(rule);
    case RuleKind::kSyscall:
      return ExplainCall(rule, set);
    case RuleKind::kUnixSocketCreation:
      break;
  }
  return ExplainSocket(rule);
}

std::string ExplainDomainLine(const std::string& domain, const Words& words) {
  const Policy::RuleForm* const form = Policy::FindRuleForm(words.front().text);
  if (form == nullptr) return "";
  Rule rule{.domain = Quoted(domain), .words = {}, .verdict = {}};
  for (const PlacedWord& word : words) {
    if (word.kind) rule.words.push_back(Quoted(word.text));
  }
  const std::size_t rest = words.size() - 1 - rule.words.size();
  if (rest == 1) rule.verdict = words.back().text;
  const bool isWhole = form->endsInGrant ? rule.Grants() || rule.verdict == "revoke" : rest <= 1;
  if (rule.words.size() < form->MinWords() || !isWhole) return "";
  return ExplainRule(form->kind, rule, Policy::FindCallSet(words[1].text));
}

std::string ExplainLabel(const Words& words) {
  constexpr std::string_view kTree = "/*";
  if (words.size() != 2) return "";
  std::string_view path = words[0].text;
  const std::string label = Quoted(words[1].text);
  if (!path.ends_with(kTree)) return Quoted(path) + " carries the label " + label + ".";
  path.remove_suffix(kTree.size());
  return Quoted(path) + " and everything beneath it carry the label " + label + ".";
}

std::string ExplainException(const Words& words) {
  if (words.size() != 3) return "";
  const std::string label = Quoted(words[1].text);
  if (words[1].text == "unlabeled") return "Running the tardisk's programs leads into no domain.";
  return "The tardisk carries the label " + label +
         ", and running something with it leads into the domain " + Quoted(words[2].text) + ".";
}

}  // namespace

std::string ExplainLine(FileRole role, const std::string& domain, const Words& words) {
  if (words.empty()) return "";
  switch (role) {
    case FileRole::kObjectFile:
      return words.size() == 1 ? "Declares the object " + Quoted(words[0].text) + "." : "";
    case FileRole::kDomainFile:
      return ExplainDomainLine(domain, words);
    case FileRole::kTardiskFile:
      return ExplainException(words);
    case FileRole::kLabelFile:
      break;
  }
  return ExplainLabel(words);
}

}  // namespace SecPolicyCli
