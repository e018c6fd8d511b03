#include "host_status.h"

#include <exception>

#include "host/linux/operation/state_use.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {

namespace {

// A load of other files, a rollback, and that nothing was loaded since the files came: the files
// are not what is installed then.
bool HasLoaded(const std::optional<LinuxHost::LoadRecord>& load, const InstalledBundle& bundle) {
  return load && load->ending == "done" && load->directory == SecPolicy::kPolicyRoot &&
         load->time >= bundle.time;
}

std::optional<BundleStatus> ReadBundleStatus(const std::optional<LinuxHost::LoadRecord>& load) {
  BundleStatus status;
  try {
    status.bundle = ReadInstalledBundle(SecPolicy::kPolicyRoot);
    if (!status.bundle) return std::nullopt;
    status.edits = FindEdits(SecPolicy::kPolicyRoot, status.bundle->manifest);
    status.isLoaded = HasLoaded(load, *status.bundle);
  } catch (const std::exception& failure) {
    status = {.bundle = {}, .problem = failure.what(), .edits = {}};
  }
  return status;
}

}  // namespace

HostStatus ReadStatus() {
  SecPolicy::TeskAccessInterfaceImpl access;
  HostStatus status;
  status.policy = ReadInstalledPolicy(access);
  status.tardisks = ReadTardisks(access);
  status.load = LinuxHost::LatestLoad(LinuxHost::CurrentState());
  status.bundle = ReadBundleStatus(status.load);
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
