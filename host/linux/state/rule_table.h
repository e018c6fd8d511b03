#pragma once

#include <optional>
#include <vector>

#include "host/linux/common/host_error.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/keyword_tables.h"
#include "policy/rule.h"

namespace LinuxHost {

// The rules of every kind but parameter checks and paths. Failures are HostErrors.
class RuleTable {
 public:
  RuleTable(StateBase& stateBase, DomainTable& domainTable, KeywordTables& keywordTables)
      : base(stateBase), domains(domainTable), keywords(keywordTables) {}

  // Installs a rule behind all others of its domain; one that names the same thing goes. `targetId`
  // is the identifier of the domain that a transition names. Throws for a domain or a word that
  // does not exist.
  void Install(const DomainReference& domain, const Policy::Rule& rule, unsigned int targetId = 0);

  // The rules of a domain and kind, in the order of their installation.
  std::vector<Policy::Rule> Read(unsigned int domainId, Policy::RuleKind kind);

 private:
  std::optional<HostError> Refusal(const DomainReference& domain, const Policy::Rule& rule,
                                   unsigned int targetId);
  bool InstallIfUnchanged(unsigned int domainId, const Policy::Rule& rule);

  StateBase& base;
  DomainTable& domains;
  KeywordTables& keywords;
};

}  // namespace LinuxHost
