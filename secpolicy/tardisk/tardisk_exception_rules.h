#pragma once

#include <list>

#include "secpolicy/report.h"
#include "secpolicy/tardisk/tardisk_rules.h"

namespace SecPolicy {

// Makes one tardisk an exception to the default tardisk policy.
struct TeskAccess_TardiskExceptionRule {
  unsigned int lineNumber = 0;
  std::string tardiskPath;
  std::string label;       // of the tardisk image
  std::string domainName;  // entered when a program with that label is executed
  unsigned int domainId = 0;
  std::string policyFile;
};

// "-E": the label of a tardisk and the domain of what it launches; at most one rule.
class TardiskExceptionRules : public virtual TardiskRules {
 public:
  void AddRule(unsigned int lineNumber, const std::string& tardiskPath,
               const std::string& policyFile, std::queue<std::string> tokens,
               TeskAccessInterfaceImpl& access) override;
  void Set(TeskAccessInterfaceImpl& access) override { SetObserved(access, Nobody()); }
  ~TardiskExceptionRules() override = default;

  // As Set, and tells `observer` what was installed for which line.
  void SetObserved(TeskAccessInterfaceImpl& access, PolicyObserver& observer);

  std::list<TeskAccess_TardiskExceptionRule> rules;
};

}  // namespace SecPolicy
