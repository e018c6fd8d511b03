#pragma once

#include <queue>
#include <string>

#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// The rules of one kind of one domain. A set lives one of two lives: it is filled from policy
// lines, checked and set (AddRule for each line, CheckConstraints, Set), or it is filled from the
// kernel and shown (ReadSystemRules, PrintRules).
class PolicyRules {
 public:
  PolicyRules() = default;
  PolicyRules(const PolicyRules&) = delete;
  PolicyRules& operator=(const PolicyRules&) = delete;

  // Appends the rule of the policy line `line`, whose keyword the caller has removed from `args`.
  // Throws a parse error that names domain and line; nothing is appended then.
  virtual void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
                       std::queue<std::string> args, TeskAccessInterfaceImpl& access) = 0;

  // Installs the rules in order. Throws at the first that is refused; those before it stay.
  virtual void Set(TeskAccessInterfaceImpl& access) = 0;

  // Appends the rules that the kernel holds for `domainId`. Throws what the kernel throws.
  virtual void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) = 0;

  // Checks the rules against each other. Throws when they conflict.
  virtual void CheckConstraints(const std::string& domainName, TeskAccessInterfaceImpl& access) = 0;

  // Prints the rules as policy lines to standard output; nothing when there are none.
  virtual void PrintRules() = 0;

  virtual ~PolicyRules() = default;

  std::string keyword;  // the rule-type word, such as "-r"
};

}  // namespace SecPolicy
