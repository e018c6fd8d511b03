#include "policy/installed_policy.h"

#include <list>
#include <set>
#include <utility>

#include "braxo/lib/exception.h"
#include "braxo/misc/strcat.h"

namespace Policy {
namespace {

using Access = TeskCtl::Security::TeskAccessInterfaceImpl;

template <class Record>
using Getter = void (Access::*)(unsigned int id, std::list<Record>& records);

// Appends the rules of one kind.
template <class Record>
void Append(Access& access, unsigned int id, Getter<Record> get, std::vector<Rule>& rules) {
  std::list<Record> records;
  (access.*get)(id, records);
  rules.reserve(rules.size() + records.size());
  for (Record& record : records) rules.push_back(TakeRule(record));
}

std::vector<Rule> ReadRules(Access& access, unsigned int id) {
  std::vector<Rule> rules;
  Append(access, id, &Access::GetObjectAccessRules, rules);
  Append(access, id, &Access::GetCapabilityRules, rules);
  Append(access, id, &Access::GetDomTransRules, rules);
  Append(access, id, &Access::GetFileCreationRules, rules);
  Append(access, id, &Access::GetCapabilityParamRules, rules);
  Append(access, id, &Access::GetFilePathAccessRules, rules);
  Append(access, id, &Access::GetSyscallRules, rules);
  Append(access, id, &Access::GetUnixSockCreationRules, rules);
  return rules;
}

Level LevelOf(const std::string& domain, const std::string& word) {
  const auto level = FindLevel(word);
  if (level) return *level;
  throw Braxo::Lib::BraxoException(
      Braxo::Misc::StrCat("unknown enforcement level '", word, "' of domain '", domain, "'"));
}

// The domain in a slot, without its rules.
std::optional<InstalledDomain> Describe(Access& access, unsigned int id) {
  InstalledDomain domain;
  domain.id = id;
  std::string level;
  if (!access.GetCompleteDomainInfo(id, domain.name, level, domain.state, domain.references,
                                    domain.worldReferences, domain.defaultRules)) {
    return std::nullopt;
  }
  domain.level = LevelOf(domain.name, level);
  return domain;
}

}  // namespace

std::optional<InstalledDomain> ReadDomain(Access& access, unsigned int id) {
  auto domain = Describe(access, id);
  if (domain) domain->rules = ReadRules(access, id);
  return domain;
}

std::vector<InstalledDomain> ListDomains(Access& access) {
  std::vector<InstalledDomain> domains;
  const unsigned int slots = access.GetMaxDomains();
  for (unsigned int id = 0; id < slots; ++id) {
    if (auto domain = Describe(access, id)) domains.push_back(std::move(*domain));
  }
  return domains;
}

InstalledPolicy ReadPolicy(Access& access) {
  InstalledPolicy policy;
  policy.domains = ListDomains(access);
  for (InstalledDomain& domain : policy.domains) domain.rules = ReadRules(access, domain.id);
  for (const auto& [name, id] :
       access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL)) {
    policy.objects.emplace(name, static_cast<unsigned int>(id));
  }
  return policy;
}

std::vector<Rule> ReadTransitionsInto(const std::string& target, Access& access) {
  std::set<Rule, BySubject> found;
  for (const InstalledDomain& domain : ListDomains(access)) {
    std::vector<Rule> transitions;
    Append(access, domain.id, &Access::GetDomTransRules, transitions);
    for (Rule& rule : transitions) {
      if (rule.Grants() && rule.words[1] == target) found.insert(std::move(rule));
    }
  }
  return {found.begin(), found.end()};
}

}  // namespace Policy
