#include <array>

#include "secpolicy/cached_domains.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/domain/check_access_domain.h"
#include "secpolicy/domain/enforcement.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

struct WellKnownDomain {
  const char* name;
  void (*cache)(unsigned int id);
  bool (TeskAccessInterfaceImpl::*announce)(unsigned int id);  // null: nobody is told
  const char* missing;
};

constexpr std::array kWellKnownDomains = {
    WellKnownDomain{"globalVMDom", CacheGlobalVMDomain, &TeskAccessInterfaceImpl::SetGlobalVMDomain,
                    "Failed to fetch domainID for global VM Domain"},
    WellKnownDomain{"ioFilterDom", CacheIOFilterDomain, &TeskAccessInterfaceImpl::SetIoFilterDomain,
                    "Failed to fetch domainID for IOFilter domain"},
    WellKnownDomain{"appDom", CacheDefaultTardiskDomain, nullptr,
                    "Failed to fetch domainID for default tar disk domain"},
    WellKnownDomain{"daemonFrameworkDom", CacheDaemonFrameworkDomain,
                    &TeskAccessInterfaceImpl::SetDaemonFrameworkDomain,
                    "Failed to fetch domainID for daemon framework domain"},
};

std::string Join(const std::string& root, const char* directory) { return root + "/" + directory; }

// A host must not come up without its well-known domains, so this ends the process: no exception is
// being handled here. A caller that loads the policy inside a handler gets its own exception back.
[[noreturn]] void Stop(const char* message) {
  SecpolicyError(message);
  throw;
}

void ResolveWellKnownDomains(TeskAccessInterfaceImpl& access) {
  for (const WellKnownDomain& domain : kWellKnownDomains) {
    unsigned int id = 0;
    if (!access.FindDomain(domain.name, &id)) Stop(domain.missing);
    domain.cache(id);
    if (domain.announce != nullptr) (access.*domain.announce)(id);
  }
}

}  // namespace

void LoadPolicy(const std::string& policyDir) {
  TeskAccessInterfaceImpl access;
  bool failed = false;
  const auto load = [&failed](auto step) {
    if (!CarryOn(step)) failed = true;
  };

  SecpolicyInfo("Using policy dir " + policyDir);
  load([&] { LoadPolicyObjects(Join(policyDir, kObjectsDir), access); });
  load([&] { CreateCheckAccessPolicyDomain(access); });
  load([&] { LoadPolicyDomains(Join(policyDir, kDomainsDir), access); });
  load([&] { LoadPartnerPolicyDomains(access); });
  ResolveWellKnownDomains(access);
  // Tardisks are the host's own, whatever policy is loaded: always under the fixed root.
  load([&] { LoadPolicyTardisks(Join(kPolicyRoot, kTardisksDir), access); });
  load([&] { LoadPolicyFileLabels(Join(policyDir, kFileLabelsDir), access); });

  if (failed) RaiseError("There were some problems encountered in setting the policy");
  SecpolicyInfo("System security policy has been set successfully");
}

void LoadPolicyEarly(const std::string& earlyPolicyDir) {
  CarryOn([&] {
    TeskAccessInterfaceImpl access;
    SecpolicyInfo("Using early policy dir " + earlyPolicyDir);
    LoadPolicyObjects(Join(kPolicyRoot, kObjectsDir), access);
    LoadPolicyDomains(Join(earlyPolicyDir, kDomainsDir), access);
    LoadPolicyFileLabels(Join(kPolicyRoot, kFileLabelsDir), access);
  });
}

void RestoreDomainEnforcement() {
  CarryOn([] {
    TeskAccessInterfaceImpl access;
    SecpolicyInfo("Restoring domain enforcement");
    RestoreDomainEnforcement(access);
  });
}

void DisplayPolicy(const std::string& domainName) {
  TeskAccessInterfaceImpl access;
  DisplayPolicyDomains(access, domainName);
  DisplayPolicyObjects(access);
  DisplayPolicyTardiskLabels(access);
}

}  // namespace SecPolicy
