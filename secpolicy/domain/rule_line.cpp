#include "secpolicy/domain/rule_line.h"

#include <utility>

#include "secpolicy/domain/policy_errors.h"
#include "secpolicy/report.h"

namespace SecPolicy {

RuleLine::RuleLine(unsigned int lineNumber, const std::string& nameOfDomain,
                   unsigned int idOfDomain, std::queue<std::string> args, Problem& noted)
    : line(lineNumber),
      domainName(nameOfDomain),
      domainId(idOfDomain),
      words(std::move(args)),
      problem(noted) {}

void RuleLine::RequireCount(std::size_t least, std::size_t most) const {
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

unsigned int RuleLine::FindDomain(const std::string& name, TeskAccessInterfaceImpl& access) const {
  Note(Fault::kUnknownDomain, taken);
  unsigned int id = 0;
  if (!access.FindDomain(name, &id)) RaiseError("Failed to fetch domain id for: " + name);
  return id;
}

void RuleLine::Validate(const std::string& text, std::size_t word,
                        TeskCtl::Security::TeskAccess_KeywordType table,
                        TeskAccessInterfaceImpl& access) const {
  Note(Fault::kUnknownWord, word);
  access.ValidateKeyword(table, text);
}

void RuleLine::Refuse(const std::string& reason) const {
  problem.reason = reason;
  RaisePolicyParseError(line, domainName, reason);
}

void RuleLine::Note(Fault fault, std::size_t word) const {
  problem.fault = fault;
  problem.word = word;
}

}  // namespace SecPolicy
