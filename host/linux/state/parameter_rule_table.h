#pragma once

#include <list>
#include <optional>
#include <string>
#include <vector>

#include "host/linux/state/domain_table.h"
#include "host/linux/state/keyword_tables.h"
#include "policy/rule.h"
#include "teskctl/security.h"

namespace LinuxHost {

// The parameter-check rules. Failures are HostErrors.
class ParameterRuleTable {
 public:
  ParameterRuleTable(StateBase& stateBase, DomainTable& domainTable, KeywordTables& keywordTables)
      : base(stateBase), domains(domainTable), keywords(keywordTables) {}

  // Installs a rule behind all others of its domain; one for the same check and range goes, however
  // it was written. Throws for a domain or a check that does not exist, and for words that are no
  // range.
  void Install(const DomainReference& domain, const Policy::Rule& rule);

  // Removes the rule for the check and exactly this range. Throws with ENOENT when there is none.
  void Remove(unsigned int domainId, const std::string& check, const Policy::ParameterRange& range);

  // The rules of a domain in the order of their installation.
  std::vector<Policy::Rule> Read(unsigned int domainId);

 private:
  std::optional<HostError> Refusal(const DomainReference& domain, const Policy::Rule& rule);
  bool InstallIfUnchanged(unsigned int domainId, const Policy::Rule& rule,
                          const Policy::ParameterRange& range);

  StateBase& base;
  DomainTable& domains;
  KeywordTables& keywords;
};

// Throws BraxoException when a range of the rules cannot be read, and HostError when two of them
// grant and revoke overlapping ranges of one check.
void RequireNoConflict(const std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule>& rules);

}  // namespace LinuxHost
