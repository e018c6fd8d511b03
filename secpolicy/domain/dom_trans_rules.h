#pragma once

#include <list>

#include "secpolicy/domain/policy_rules.h"

namespace SecPolicy {

// "-d": the domains that a domain may pass into.
class DomTransRules : public virtual PolicyRules {
 public:
  void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
               std::queue<std::string> args, TeskAccessInterfaceImpl& access) override;
  void Set(TeskAccessInterfaceImpl& access) override;
  void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) override;
  void CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) override {}
  void PrintRules() override;
  ~DomTransRules() override = default;

  std::list<TeskCtl::Security::TeskAccess_DomTransRule> rules;
};

}  // namespace SecPolicy
