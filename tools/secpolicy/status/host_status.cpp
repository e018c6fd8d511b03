#include "host_status.h"

#include "host/linux/operation/state_use.h"

namespace SecPolicyCli {

HostStatus ReadStatus() {
  SecPolicy::TeskAccessInterfaceImpl access;
  HostStatus status;
  status.policy = ReadInstalledPolicy(access);
  status.tardisks = ReadTardisks(access);
  status.load = LinuxHost::LatestLoad(LinuxHost::CurrentState());
  status.worlds = LinuxHost::ListWorlds(LinuxHost::CurrentState());
  for (const Policy::InstalledDomain& domain : status.policy.domains) {
    status.domainsByLevel[domain.level].push_back(domain.name);
    status.ruleCount += domain.rules.size();
    if (domain.isGone) status.domainsWithoutFile.push_back(domain.name);
    for (const Policy::Rule& rule : domain.rules) {
      if (rule.origin.isGone) ++status.rulesWithoutLine;
      ++status.rulesByKind[rule.kind];
    }
  }
  return status;
}

}  // namespace SecPolicyCli
