#pragma once

#include <map>
#include <memory>
#include <queue>
#include <string>

#include "secpolicy/domain/policy_rules.h"
#include "secpolicy/report.h"

namespace SecPolicy {

// The policy of one domain: one rule set of each kind. Everything here throws BraxoException unless
// it says otherwise.
class DomainPolicy {
 public:
  // The domain `name` with the kernel identifier `id`, and empty rule sets.
  DomainPolicy(const std::string& name, unsigned int id);

  // Reads `policyFile` into the rule sets. Throws at the first bad line; the rules before it stay.
  void ParsePolicy(TeskAccessInterfaceImpl& access, PolicyObserver& observer = Nobody());

  // Hands every line of `parsed` to the rule set of its first word, which is taken off the line.
  // Throws at the first bad line; the rules before it stay.
  void ProcessParsedPolicyFile(TeskAccessInterfaceImpl& access,
                               std::map<unsigned int, std::queue<std::string>>& parsed);

  // The same for one line, which has tokens. Throws LineFailure.
  void ParseLine(unsigned int line, std::queue<std::string>& tokens,
                 TeskAccessInterfaceImpl& access);

  // Checks the rules of each set against each other. Throws at the first set that fails.
  void CheckPolicyConstraints(TeskAccessInterfaceImpl& access);

  // Installs all rule sets. Throws, having touched none, while `hasErrors` is set, and at the first
  // set that is refused; those before it stay installed.
  void SetPolicy(TeskAccessInterfaceImpl& access, PolicyObserver& observer = Nobody());

  // Fills the rule sets from the kernel. A set that cannot be read is reported, not thrown.
  void ReadSystemPolicy(TeskAccessInterfaceImpl& access, PolicyObserver& observer = Nobody());

  // Prints the rules to standard output.
  void PrintPolicy();

  unsigned int id;
  std::string name;
  std::string policyFile;  // set by the loader before ParsePolicy
  bool hasErrors = false;  // set by the loader when the constraints check failed

  // By rule-type keyword. The order of the keywords is the order in which rules reach the kernel
  // and are printed.
  std::map<std::string, std::unique_ptr<PolicyRules>> ruleSets;

 private:
  template <class Rules>
  void AddRuleSet(const char* keyword);
};

}  // namespace SecPolicy
