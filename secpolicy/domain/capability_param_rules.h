#pragma once

#include <list>

#include "secpolicy/domain/policy_rules.h"

namespace SecPolicy {

// "-p": the parameters with which a domain may use its capabilities.
class CapabilityParamRules : public virtual PolicyRules {
 public:
  void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
               std::queue<std::string> args, TeskAccessInterfaceImpl& access) override;
  void Set(TeskAccessInterfaceImpl& access) override;
  void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) override;
  void CheckConstraints(const std::string& domainName, TeskAccessInterfaceImpl& access) override;
  void PrintRules() override;
  ~CapabilityParamRules() override = default;

  std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule> rules;
};

}  // namespace SecPolicy
