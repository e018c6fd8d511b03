#pragma once

#include <optional>
#include <string_view>
#include <vector>

#include "host/linux/common/host_error.h"
#include "policy/rule.h"

namespace LinuxHost {

class HostState;
struct Domain;

// A domain as a caller knows it. The name may be empty: then the identifier alone counts.
struct DomainReference {
  unsigned int id = 0;
  std::string_view name;
};

// Why the reference is to no domain; empty when it is to one.
std::optional<HostError> DomainRefusal(HostState& state, const DomainReference& reference);

// The rules of every kind but parameter checks and paths. Failures are HostErrors.
class RuleTable {
 public:
  explicit RuleTable(HostState& owner);

  // Installs a rule behind all others of its domain; one that names the same thing goes. `targetId`
  // is the identifier of the domain that a transition names. Throws for a domain or a word that
  // does not exist.
  void Install(const DomainReference& domain, const Policy::Rule& rule, unsigned int targetId = 0);

  // The rules of a domain and kind, in the order of their installation.
  std::vector<Policy::Rule> Read(unsigned int domainId, Policy::RuleKind kind);

  // For the tables of domains and labels, within their transactions: removes the rules of a domain
  // that is gone and the transitions into it, and the rules that name a label that is gone.
  void RemoveDomain(const Domain& domain);
  void RemoveUnnamed();

 private:
  std::optional<HostError> Refusal(const DomainReference& domain, const Policy::Rule& rule,
                                   unsigned int targetId);
  bool InstallIfUnchanged(unsigned int domainId, const Policy::Rule& rule);

  HostState& state;
};

}  // namespace LinuxHost
