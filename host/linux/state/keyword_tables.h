#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>

#include "host/linux/common/host_error.h"
#include "teskctl/security.h"

namespace LinuxHost {

class DomainTable;
class LabelTable;

// The transition kind of executing a program that came from a tardisk.
constexpr char kTardiskExec[] = "tardisk_exec";

// The words that rules consist of. All but the labels are the same on every host.
class KeywordTables {
 public:
  KeywordTables(DomainTable& domainTable, LabelTable& labelTable)
      : domains(domainTable), labels(labelTable) {}

  // The words of a table and their identifiers; for labels, the object labels. Throws HostError for
  // a type that is no table.
  std::map<std::string, long> All(TeskCtl::Security::TeskAccess_KeywordType type);

  // Why `word` is not in the table; empty when it is. A label is an object label or the name of a
  // domain. Throws HostError for a type that is no table.
  std::optional<HostError> Refusal(TeskCtl::Security::TeskAccess_KeywordType type,
                                   std::string_view word);

 private:
  bool Has(TeskCtl::Security::TeskAccess_KeywordType type, std::string_view word);

  DomainTable& domains;
  LabelTable& labels;
};

// The words of any table but that of labels. Throws HostError for a type that is no such table.
std::map<std::string, long> FixedWords(TeskCtl::Security::TeskAccess_KeywordType type);

// The words of the capability and the parameter check with the identifier `id`. Throw HostError
// when there is none.
std::string CapabilityWord(std::uint64_t id);
std::string ParameterCheckWord(std::uint64_t id);

}  // namespace LinuxHost
