#pragma once

#include <list>
#include <optional>
#include <string>
#include <string_view>

#include "host/linux/state/parameter_range.h"
#include "host/linux/state/rule_table.h"
#include "host/linux/state/store.h"
#include "teskctl/security.h"

namespace LinuxHost {

class HostState;

// One parameter-check rule to install.
struct ParameterRule {
  DomainReference domain;
  std::string_view check;
  ParameterRange range;
  std::string_view firstWord;  // the range as it was written
  std::string_view lastWord;   // may be empty
  bool granted = false;
  unsigned int line = 0;
};

// The parameter-check rules. Failures are HostErrors.
class ParameterRuleTable {
 public:
  explicit ParameterRuleTable(HostState& owner);

  // Installs a rule behind all others of its domain; one for the same check and range goes, however
  // it was written. Throws for a domain or a check that does not exist.
  void Install(const ParameterRule& rule);

  // Removes the rule for the check and exactly this range. Throws with ENOENT when there is none.
  void Remove(unsigned int domainId, const std::string& check, const ParameterRange& range);

  // The rules of a domain in the order of their installation: columns 0 to 2 are the check and the
  // words of the range, 3 is whether it grants, 4 the line.
  [[nodiscard]] Rows Read(unsigned int domainId);

 private:
  std::optional<HostError> Refusal(const ParameterRule& rule);
  bool InstallIfUnchanged(const ParameterRule& rule);

  HostState& state;
};

// Throws HostError when a range of the rules cannot be read, and when two of them grant and revoke
// overlapping ranges of one check.
void RequireNoConflict(const std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule>& rules);

}  // namespace LinuxHost
