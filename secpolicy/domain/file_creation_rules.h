#pragma once

#include <list>
#include <utility>

#include "secpolicy/domain/policy_rules.h"

namespace SecPolicy {

// "-f": the files that a domain may create, and under which labels.
class FileCreationRules : public virtual PolicyRules {
 public:
  void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
               std::queue<std::string> args, TeskAccessInterfaceImpl& access) override {
    AddWords(line, domainName, domainId, std::move(args), access);
  }
  void Set(TeskAccessInterfaceImpl& access) override;
  void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) override;
  void CheckConstraints(const std::string& domainName, TeskAccessInterfaceImpl& access) override;
  void PrintRules() override;
  ~FileCreationRules() override = default;
  void AddLine(RuleLine& line, TeskAccessInterfaceImpl& access) override;

  std::list<TeskCtl::Security::TeskAccess_FileCreationRule> rules;
};

}  // namespace SecPolicy
