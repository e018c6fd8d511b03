#include "host_status.h"

#include <exception>

#include "host/linux/operation/label_journal.h"
#include "host/linux/operation/state_use.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {

namespace {

std::optional<BundleStatus> ReadBundleStatus() {
  BundleStatus status;
  try {
    status.bundle = ReadInstalledBundle(SecPolicy::kPolicyRoot);
    if (!status.bundle) return std::nullopt;
    status.edits = FindEdits(SecPolicy::kPolicyRoot, status.bundle->manifest);
    status.isLoaded = LinuxHost::LoadedBundle(LinuxHost::CurrentState()) == status.bundle->digest;
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
  status.isLabelling = LinuxHost::LabelJournal::IsThere(LinuxHost::StatePath());
  status.bundle = ReadBundleStatus();
  if (IsOfMachine()) status.module = ReadModuleStatus();
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
