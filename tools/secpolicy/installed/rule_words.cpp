#include "rule_words.h"

#include <queue>

#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {
namespace {

constexpr char kPathRule[] = "-r";

}  // namespace

RuleWords SplitRule(const std::string& text) {
  RuleWords rule;
  const std::size_t first = text.find(' ');
  rule.keyword = text.substr(0, first);
  if (first == std::string::npos) return rule;

  if (rule.keyword == kPathRule) {
    const std::size_t last = text.rfind(' ');
    const std::size_t path = first + 1;
    if (last < path) return rule;
    rule.words = {text.substr(path, last - path), text.substr(last + 1)};
    return rule;
  }
  // As the library splits lines: a tab is part of a word.
  std::queue<std::string> rest = SecPolicy::StringToQueue(text.substr(first + 1));
  for (; !rest.empty(); rest.pop()) rule.words.push_back(rest.front());
  if (rule.words.empty()) return rule;
  rule.grant = rule.words.back() == "grant";
  rule.words.pop_back();
  return rule;
}

}  // namespace SecPolicyCli
