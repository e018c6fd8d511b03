#include "installed_policy.h"

#include <algorithm>
#include <list>
#include <optional>
#include <utility>

#include "domain_file.h"
#include "host/linux/operation/rule_origins.h"
#include "host/linux/operation/stable_view.h"
#include "kitlibs/file.h"
#include "printed_rules.h"
#include "secpolicy/domain/domain_policy.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::RuleSource;
using SecPolicy::TeskAccessInterfaceImpl;

using Origins = std::map<std::string, Origin>;

Origins ReadOrigins(const std::string& domain) {
  Origins origins;
  for (LinuxHost::RuleOrigin& origin : LinuxHost::FindRuleOrigins(domain)) {
    origins.emplace(std::move(origin.rule),
                    Origin{.file = std::move(origin.file), .line = origin.line});
  }
  return origins;
}

// A rule that a load installed is written in the file of its domain, unless it is told otherwise.
Origin OriginOf(const std::string& domain, const RuleSource& source) {
  if (!source.kind || source.line == 0) return {};
  const bool isEarly = source.kind == LinuxHost::LoadKind::kEarly;
  return {.file = isEarly ? source.directory + "/" + SecPolicy::kDomainsDir + "/" + domain
                          : DomainFile(domain, source.directory),
          .line = source.line};
}

std::vector<InstalledRule> ReadRules(const std::string& name, unsigned int id,
                                     TeskAccessInterfaceImpl& access) {
  const Origins recorded = ReadOrigins(name);
  SecPolicy::DomainPolicy policy(name, id);
  std::vector<InstalledRule> rules;
  // Set by set, because reading a whole domain reports a set that cannot be read and goes on.
  for (const auto& [keyword, ruleSet] : policy.ruleSets) {
    ruleSet->ReadSystemRules(id, access);
    const std::vector<RuleSource> sources =
        LinuxHost::FindRuleSources(id, Policy::FindRuleForm(keyword)->kind);
    auto source = sources.begin();
    for (std::string& text : PrintedRules(*ruleSet)) {
      const auto origin = recorded.find(text);
      rules.push_back(
          {.text = std::move(text),
           .origin = origin == recorded.end() ? OriginOf(name, *source) : origin->second,
           .hasNoLine = !source->isCurrent});
      ++source;
    }
  }
  return rules;
}

std::optional<InstalledDomain> ReadDomain(unsigned int id, TeskAccessInterfaceImpl& access) {
  InstalledDomain domain;
  domain.id = id;
  if (!access.GetCompleteDomainInfo(id, domain.name, domain.level, domain.state, domain.references,
                                    domain.worldReferences, domain.defaultRules)) {
    return std::nullopt;
  }
  domain.rules = ReadRules(domain.name, id, access);
  return domain;
}

std::string ReadLabel(const std::string& path, TeskAccessInterfaceImpl& access) {
  try {
    return SecPolicy::GetFileLabel(path, access);
  } catch (const Braxo::Lib::BraxoException&) {
    return "";
  }
}

// A root without the directory of tardisks has none.
std::list<std::string> ListTardisks() {
  std::list<std::string> paths;
  if (File_IsDirectory(SecPolicy::kTardiskImagesDir)) SecPolicy::GetAllTardisks(paths);
  paths.sort();
  return paths;
}

std::vector<InstalledDomain> ReadDomains(TeskAccessInterfaceImpl& access) {
  std::vector<InstalledDomain> domains;
  const unsigned int slots = access.GetMaxDomains();
  for (unsigned int id = 0; id < slots; ++id) {
    if (auto domain = ReadDomain(id, access)) domains.push_back(std::move(*domain));
  }
  const std::vector<std::string> withoutFile = LinuxHost::FindDomainsWithoutFile();
  for (InstalledDomain& domain : domains) {
    domain.hasNoFile = std::binary_search(withoutFile.begin(), withoutFile.end(), domain.name);
  }
  return domains;
}

}  // namespace

InstalledPolicy ReadInstalledPolicy(TeskAccessInterfaceImpl& access) {
  // A load may end meanwhile.
  const LinuxHost::StableView view;
  InstalledPolicy policy;
  policy.domains = ReadDomains(access);
  for (const auto& [name, id] :
       access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL)) {
    policy.objects.emplace(name, static_cast<unsigned int>(id));
  }
  for (const std::string& path : ListTardisks()) {
    policy.tardisks.push_back({.path = path, .label = ReadLabel(path, access)});
  }
  return policy;
}

}  // namespace SecPolicyCli
