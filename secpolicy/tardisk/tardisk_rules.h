#pragma once

#include <queue>
#include <string>

#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// The rules of one kind of one tardisk policy file.
class TardiskRules {
 public:
  TardiskRules() = default;
  TardiskRules(const TardiskRules&) = delete;
  TardiskRules& operator=(const TardiskRules&) = delete;

  // Appends the rule of the line `lineNumber` of `policyFile`, which came from the tardisk
  // `tardiskPath`; the caller has removed the keyword from `tokens`. Throws LineFailure for a bad
  // line; nothing is appended then.
  virtual void AddRule(unsigned int lineNumber, const std::string& tardiskPath,
                       const std::string& policyFile, std::queue<std::string> tokens,
                       TeskAccessInterfaceImpl& access) = 0;

  // Installs the rules. Throws BraxoException at the first that fails.
  virtual void Set(TeskAccessInterfaceImpl& access) = 0;

  virtual ~TardiskRules() = default;

  std::string ruleType;  // the keyword, such as "-E"
};

// Throws LineFailure for a line of a tardisk policy file that cannot be read.
[[noreturn]] void RaiseTardiskParseError(const std::string& policyFile, const Problem& problem);

}  // namespace SecPolicy
