#include "enforce/domain_of.h"

#include <algorithm>
#include <sstream>
#include <stdexcept>

namespace EnforceTest {

Policy::Rule RuleOf(const std::string& line) {
  std::istringstream words(line);
  std::string word;
  words >> word;
  const Policy::RuleForm* const form = Policy::FindRuleForm(word);
  if (form == nullptr) throw std::invalid_argument(line);
  std::vector<std::string> rest;
  while (words >> word) rest.push_back(word);
  Policy::Rule rule;
  rule.kind = form->kind;
  if (!form->endsInGrant) {
    rule.words[0] = rest.front();
    rule.verdict = Policy::Permissions::Parse(rest.size() > 1 ? rest.back() : "");
    return rule;
  }
  rule.verdict = rest.back() == "grant";
  if (!rule.Grants() && rest.back() != "revoke") throw std::invalid_argument(line);
  std::copy(rest.begin(), rest.end() - 1, rule.words.begin());
  return rule;
}

Policy::InstalledDomain DomainOf(const std::vector<std::string>& lines) {
  Policy::InstalledDomain domain;
  domain.name = "testDom";
  for (const std::string& line : lines) domain.rules.push_back(RuleOf(line));
  return domain;
}

std::vector<std::string> Told(const std::vector<Enforce::RuleFate>& fates) {
  std::vector<std::string> told;
  for (const auto& [rule, fate, how, place] : fates) {
    if (fate == Enforce::Fate::kEnforced && how.empty()) continue;
    told.push_back(std::string(TextOf(fate)) + ": " + rule.Text() + " (" + how + ")");
  }
  return told;
}

}  // namespace EnforceTest
