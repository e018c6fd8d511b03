#pragma once

#include <list>
#include <utility>

#include "secpolicy/domain/policy_rules.h"

namespace SecPolicy {

// "-a": how a domain may use labelled objects.
class ObjectAccessRules : public virtual PolicyRules {
 public:
  void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
               std::queue<std::string> args, TeskAccessInterfaceImpl& access) override {
    AddWords(line, domainName, domainId, std::move(args), access);
  }
  void Set(TeskAccessInterfaceImpl& access) override;
  void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) override;
  void CheckConstraints(const std::string& domainName, TeskAccessInterfaceImpl& access) override;
  void PrintRules() override;
  ~ObjectAccessRules() override = default;
  void AddLine(RuleLine& line, TeskAccessInterfaceImpl& access) override;

  std::list<TeskCtl::Security::TeskAccess_ObjectAccessRule> rules;
};

}  // namespace SecPolicy
