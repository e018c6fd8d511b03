#pragma once

#include <array>
#include <optional>
#include <string>
#include <string_view>

#include "host/linux/common/host_error.h"
#include "host/linux/state/store.h"

namespace LinuxHost {

class HostState;
struct Domain;

// The kinds of rules that consist of words.
enum class RuleKind {
  Syscall,
  Capability,
  ObjectAccess,
  DomainTransition,
  FileCreation,
  UnixSocketCreation
};

constexpr std::size_t kMaxRuleWords = 3;

// A domain as a caller knows it. The name may be empty: then the identifier alone counts.
struct DomainReference {
  unsigned int id = 0;
  std::string_view name;
};

// Why the reference is to no domain; empty when it is to one.
std::optional<HostError> DomainRefusal(HostState& state, const DomainReference& reference);

// One rule to install. Words that its kind does not have stay empty.
struct Rule {
  DomainReference domain;
  RuleKind kind = RuleKind::Syscall;
  std::array<std::string_view, kMaxRuleWords> words;
  unsigned int targetId = 0;  // of a domain transition; its second word is the name
  bool granted = false;
  unsigned int line = 0;
};

// The rules that consist of words. Failures are HostErrors.
class RuleTable {
 public:
  explicit RuleTable(HostState& owner);

  // Installs a rule behind all others of its domain; one that names the same thing goes. Throws
  // for a domain or a word that does not exist.
  void Install(const Rule& rule);

  // The rules of a domain and kind, in the order of their installation: columns 0 to 2 are the
  // words, 3 is whether it grants, 4 the line.
  [[nodiscard]] Rows Read(unsigned int domainId, RuleKind kind);

  // For the tables of domains and labels, within their transactions: removes the rules of a domain
  // that is gone and the transitions into it, and the rules that name a label that is gone.
  void RemoveDomain(const Domain& domain);
  void RemoveUnnamed();

 private:
  std::optional<HostError> Refusal(const Rule& rule);
  bool InstallIfUnchanged(const Rule& rule);

  HostState& state;
};

}  // namespace LinuxHost
