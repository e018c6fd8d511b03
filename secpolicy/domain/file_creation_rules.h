#pragma once

#include <list>

#include "secpolicy/domain/policy_rules.h"

namespace SecPolicy {

// "-f": the files that a domain may create, and under which labels.
class FileCreationRules : public virtual PolicyRules {
 public:
  void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
               std::queue<std::string> args, TeskAccessInterfaceImpl& access) override;
  void Set(TeskAccessInterfaceImpl& access) override;
  void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) override;
  void CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) override {}
  void PrintRules() override;
  ~FileCreationRules() override = default;

  std::list<TeskCtl::Security::TeskAccess_FileCreationRule> rules;
};

}  // namespace SecPolicy
