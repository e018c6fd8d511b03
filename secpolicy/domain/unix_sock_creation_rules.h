#pragma once

#include <list>

#include "secpolicy/domain/policy_rules.h"

namespace SecPolicy {

// "-u": the unix sockets that a domain may create.
class UnixSockCreationRules : public virtual PolicyRules {
 public:
  void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
               std::queue<std::string> args, TeskAccessInterfaceImpl& access) override;
  void Set(TeskAccessInterfaceImpl& access) override;
  void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) override;
  void CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) override {}
  void PrintRules() override;
  ~UnixSockCreationRules() override = default;

  std::list<TeskCtl::Security::TeskAccess_UnixSockCreationRule> rules;
};

}  // namespace SecPolicy
