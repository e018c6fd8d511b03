#pragma once

#include <array>
#include <list>
#include <queue>
#include <string>
#include <utility>

#include "secpolicy/domain/policy_errors.h"
#include "secpolicy/domain/rule_line.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

// The steps that the rule families share; for their .cpp files only.
namespace SecPolicy {

// A word of a rule line: where it is kept, and the kernel's table that it has to be in.
template <class Rule>
struct RuleToken {
  std::string Rule::*field;
  TeskCtl::Security::TeskAccess_KeywordType keywords;
};

// Spelt out for compilers that do not find it themselves.
template <class Rule>
RuleToken(std::string Rule::*, TeskCtl::Security::TeskAccess_KeywordType) -> RuleToken<Rule>;

// Fills a record with the line's header and with what `take` takes from the line, and appends it.
// A failure becomes a parse error that names the line; nothing is appended then.
template <class Rule, class Take>
void AppendRule(std::list<Rule>& rules, RuleLine line, Take take) {
  try {
    Rule rule;
    rule.line = line.number;
    rule.domainId = line.domainId;
    rule.domainName = line.domainName;
    take(rule, line);
    rules.push_back(std::move(rule));
  } catch (const Braxo::Lib::BraxoException& failure) {
    line.Refuse(failure.what());
  }
}

// The same of a line of exactly `tokens` and the grant word. The words are checked after all are
// taken, so a bad grant word is reported before a word that the kernel does not know.
template <class Rule, std::size_t Count>
void AppendRule(std::list<Rule>& rules, RuleLine words,
                const std::array<RuleToken<Rule>, Count>& tokens) {
  AppendRule(rules, words, [&](Rule& rule, RuleLine& line) {
    line.RequireCount(Count + 1);
    for (const RuleToken<Rule>& token : tokens) rule.*token.field = line.Take();
    rule.grant = line.TakeGrant();
    std::size_t word = 0;
    for (const RuleToken<Rule>& token : tokens) {
      line.Validate(rule.*token.field, ++word, token.keywords);
    }
  });
}

// Hands a copy of every rule to the kernel, in order. A refusal becomes a set error that names the
// line; the rules before it stay installed.
template <class Rule>
void SetEach(const std::list<Rule>& rules, TeskAccessInterfaceImpl& access,
             void (TeskAccessInterfaceImpl::*set)(Rule rule)) {
  for (const Rule& rule : rules) {
    try {
      (access.*set)(rule);
    } catch (const Braxo::Lib::BraxoException& failure) {
      RaisePolicySetError(rule.line, rule.domainName, failure.what());
    }
  }
}

// Appends `word` to a printed rule, behind a blank.
inline void AppendWord(std::string& text, const std::string& word) {
  text += ' ';
  text += word;
}

inline void AppendGrant(std::string& text, bool grant) {
  AppendWord(text, grant ? "grant" : "revoke");
}

// Prints every rule as a policy line, whose words `appendWords` appends to the keyword, and two
// empty lines after the last one; nothing when there are no rules.
template <class Rule, class AppendWords>
void PrintEach(const std::string& keyword, const std::list<Rule>& rules, AppendWords appendWords) {
  if (rules.empty()) return;
  for (const Rule& rule : rules) {
    std::string text = keyword;
    appendWords(text, rule);
    PrintLine(std::move(text));
  }
  PrintLine();
  PrintLine();
}

// The same of rules that are `tokens` and the grant word.
template <class Rule, std::size_t Count>
void PrintEach(const std::string& keyword, const std::list<Rule>& rules,
               const std::array<RuleToken<Rule>, Count>& tokens) {
  PrintEach(keyword, rules, [&](std::string& text, const Rule& rule) {
    for (const RuleToken<Rule>& token : tokens) AppendWord(text, rule.*token.field);
    AppendGrant(text, rule.grant);
  });
}

}  // namespace SecPolicy
