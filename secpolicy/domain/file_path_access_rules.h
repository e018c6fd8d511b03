#pragma once

#include <list>

#include "secpolicy/domain/policy_rules.h"
#include "secpolicy/report.h"

namespace SecPolicy {

// "-r": the paths that a domain may read, write and execute.
class FilePathAccessRules : public virtual PolicyRules {
 public:
  void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
               std::queue<std::string> args, TeskAccessInterfaceImpl& access) override;
  void Set(TeskAccessInterfaceImpl&) override { SetObserved(Nobody()); }
  void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) override;
  void CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) override {}
  void PrintRules() override;
  ~FilePathAccessRules() override = default;

  // As Set, and tells `observer` of each rule: the host is not told the lines of these.
  void SetObserved(PolicyObserver& observer);

  // Returns the kernel's permission mask for `permissions`, at most one each of "r", "w" and "x";
  // 0 when empty. Throws for anything else, with a message that names neither domain nor line.
  unsigned int GetPermission(const std::string& permissions);

  std::list<TeskCtl::Security::TeskAccess_FilePathAccessRule> rules;
};

}  // namespace SecPolicy
