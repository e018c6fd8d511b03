#include "installed_policy.h"

#include <algorithm>
#include <list>

#include "host/linux/operation/rule_origins.h"
#include "host/linux/operation/stable_view.h"
#include "host/linux/operation/state_use.h"
#include "kitlibs/file.h"
#include "policy_dir.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::RuleSource;
using Policy::InstalledDomain;
using Policy::InstalledPolicy;
using Policy::Origin;
using Policy::Rule;
using SecPolicy::TeskAccessInterfaceImpl;

// A rule that a load installed is written in the file of its domain, unless it is told otherwise.
std::string FileOf(const std::string& domain, const RuleSource& source) {
  const bool isEarly = source.kind == LinuxHost::LoadKind::kEarly;
  return isEarly ? source.directory + "/" + SecPolicy::kDomainsDir + "/" + domain
                 : DomainFile(domain, source.directory);
}

Origin OriginOf(const std::string& domain, const Rule& rule, const RuleSource& source) {
  Origin origin;
  origin.isGone = !source.isCurrent;
  if (!source.kind || rule.line == 0) return origin;
  origin.file = FileOf(domain, source);
  origin.line = rule.line;
  return origin;
}

void AddOrigins(InstalledDomain& domain, LinuxHost::HostState& state) {
  auto rule = domain.rules.begin();
  const auto isOf = [&](Policy::RuleKind kind) {
    return rule != domain.rules.end() && rule->kind == kind;
  };
  for (const Policy::RuleForm& form : Policy::kRuleForms) {
    for (const RuleSource& source : LinuxHost::FindRuleSources(state, domain.id, form.kind)) {
      if (!isOf(form.kind)) break;
      rule->origin = OriginOf(domain.name, *rule, source);
      ++rule;
    }
    while (isOf(form.kind)) ++rule;
  }
  LinuxHost::FindRuleOrigins(state, domain.name, domain.rules);
}

std::string ReadLabel(const std::string& path, TeskAccessInterfaceImpl& access) {
  try {
    return SecPolicy::GetFileLabel(path, access);
  } catch (const Braxo::Lib::BraxoException&) {
    return "";
  }
}

}  // namespace

InstalledPolicy ReadInstalledPolicy(TeskAccessInterfaceImpl& access) {
  // A load may end meanwhile.
  const LinuxHost::StableView view(LinuxHost::CurrentState());
  InstalledPolicy policy = Policy::ReadPolicy(access);
  const std::vector<std::string> withoutFile = LinuxHost::FindDomainsWithoutFile(view.State());
  for (InstalledDomain& domain : policy.domains) {
    domain.isGone = std::binary_search(withoutFile.begin(), withoutFile.end(), domain.name);
    AddOrigins(domain, view.State());
  }
  return policy;
}

std::optional<InstalledDomain> ReadInstalledDomain(const std::string& name,
                                                   TeskAccessInterfaceImpl& access) {
  const LinuxHost::StableView view(LinuxHost::CurrentState());
  unsigned int id = 0;
  if (!access.FindDomain(name, &id)) return std::nullopt;
  auto domain = Policy::ReadDomain(access, id);
  if (domain) AddOrigins(*domain, view.State());
  return domain;
}

std::vector<InstalledTardisk> ReadTardisks(TeskAccessInterfaceImpl& access) {
  std::list<std::string> paths;
  // A root without the directory of tardisks has none.
  if (File_IsDirectory(SecPolicy::kTardiskImagesDir)) SecPolicy::GetAllTardisks(paths);
  paths.sort();
  std::vector<InstalledTardisk> tardisks;
  for (const std::string& path : paths) {
    tardisks.push_back({.path = path, .label = ReadLabel(path, access)});
  }
  return tardisks;
}

}  // namespace SecPolicyCli
