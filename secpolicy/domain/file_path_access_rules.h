#pragma once

#include <list>
#include <utility>

#include "secpolicy/domain/policy_rules.h"

namespace SecPolicy {

// "-r": the paths that a domain may read, write and execute.
class FilePathAccessRules : public virtual PolicyRules {
 public:
  void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
               std::queue<std::string> args, TeskAccessInterfaceImpl& access) override {
    AddWords(line, domainName, domainId, std::move(args), access);
  }
  void Set(TeskAccessInterfaceImpl& access) override;
  void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) override;
  void CheckConstraints(const std::string& domainName, TeskAccessInterfaceImpl& access) override;
  void PrintRules() override;
  ~FilePathAccessRules() override = default;
  void AddLine(RuleLine& line, TeskAccessInterfaceImpl& access) override;
  void SetObserved(TeskAccessInterfaceImpl& access, PolicyObserver& observer) override;

  // Returns the kernel's permission mask for `permissions`, at most one each of "r", "w" and "x";
  // 0 when empty. Throws for anything else, with a message that names neither domain nor line.
  unsigned int GetPermission(const std::string& permissions);

  std::list<TeskCtl::Security::TeskAccess_FilePathAccessRule> rules;
};

}  // namespace SecPolicy
