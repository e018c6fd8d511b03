#pragma once

#include <queue>
#include <string>

#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// What a tardisk policy does, with somebody who is told.
class TardiskPolicySteps {
 public:
  // `tardiskPolicy` and `told` are only borrowed.
  TardiskPolicySteps(TardiskPolicy& tardiskPolicy, PolicyObserver& told)
      : policy(tardiskPolicy), observer(told) {}

  // As the policy's own.
  std::string GetBackingTardiskPath();
  void ParsePolicy(TeskAccessInterfaceImpl& access);
  void SetPolicy(TeskAccessInterfaceImpl& access);

  // Reads a line of the policy file, which came from `tardisk`. Throws LineFailure for a bad one.
  void ParseLine(const std::string& tardisk, unsigned int line, std::queue<std::string>& tokens,
                 TeskAccessInterfaceImpl& access);

 private:
  TardiskPolicy& policy;
  PolicyObserver& observer;
};

// Reports that a policy file came from no tardisk.
void ReportWithoutTardisk(const std::string& policyFile, PolicyObserver& observer);

}  // namespace SecPolicy
