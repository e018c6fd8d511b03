#include "secpolicy/domain/rule_line.h"

#include <utility>

#include "secpolicy/domain/policy_errors.h"
#include "secpolicy/report.h"

namespace SecPolicy {

void RuleLine::RequireCount(std::size_t least, std::size_t most) {
  Note(Fault::kArgumentCount, Problem::kWholeLine);
  if (words.size() < least || words.size() > most) RuleSizeError();
}

std::string RuleLine::Take() {
  std::string word = std::move(words.front());
  words.pop();
  ++taken;
  return word;
}

bool RuleLine::TakeGrant() {
  std::string word = Take();
  Note(Fault::kGrantWord, taken);
  return IsGrant(word);
}

unsigned int RuleLine::FindDomain(const std::string& domain) {
  Note(Fault::kUnknownDomain, taken);
  unsigned int id = 0;
  if (!access.FindDomain(domain, &id)) RaiseError("Failed to fetch domain id for: " + domain);
  return id;
}

void RuleLine::Validate(const std::string& text, std::size_t word,
                        TeskCtl::Security::TeskAccess_KeywordType table) {
  Note(Fault::kUnknownWord, word);
  access.ValidateKeyword(table, text);
}

void RuleLine::Refuse(const std::string& reason) const {
  RaisePolicyParseError(number, domainName, reason, notedFault, notedWord);
}

void RuleLine::Note(Fault fault, std::size_t word) {
  notedFault = fault;
  notedWord = word;
}

}  // namespace SecPolicy
