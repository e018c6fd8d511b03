#include <array>
#include <iterator>

#include "secpolicy/cached_domains.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/domain/check_access_domain.h"
#include "secpolicy/domain/enforcement.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

// What becomes of the identifier of a domain that every host needs.
struct WellKnownDomain {
  void (*cache)(unsigned int id);
  bool (TeskAccessInterfaceImpl::*announce)(unsigned int id);  // null: the kernel is not told
  const char* missing;
};

// In the order of kNeededDomains.
constexpr std::array<WellKnownDomain, std::size(kNeededDomains)> kWellKnownDomains = {{
    {CacheGlobalVMDomain, &TeskAccessInterfaceImpl::SetGlobalVMDomain,
     "Failed to fetch domainID for global VM Domain"},
    {CacheIOFilterDomain, &TeskAccessInterfaceImpl::SetIoFilterDomain,
     "Failed to fetch domainID for IOFilter domain"},
    {CacheDefaultTardiskDomain, nullptr, "Failed to fetch domainID for default tar disk domain"},
    {CacheDaemonFrameworkDomain, &TeskAccessInterfaceImpl::SetDaemonFrameworkDomain,
     "Failed to fetch domainID for daemon framework domain"},
}};

std::string Join(const std::string& root, const char* directory) { return root + "/" + directory; }

// A host must not come up without its well-known domains, so this ends the process: no exception is
// being handled here. A caller that loads the policy inside a handler gets its own exception back.
[[noreturn]] void StopWithout(const char* domain, const char* message, PolicyObserver& observer) {
  observer.OnMissingDomain(domain);
  ReportError(message, observer);
  throw;
}

void ResolveWellKnownDomains(TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  for (std::size_t i = 0; i < kWellKnownDomains.size(); ++i) {
    const auto& [cache, announce, missing] = kWellKnownDomains[i];
    unsigned int id = 0;
    if (!access.FindDomain(kNeededDomains[i], &id))
      StopWithout(kNeededDomains[i], missing, observer);
    cache(id);
    if (announce != nullptr) (access.*announce)(id);
  }
}

void LoadPolicy(const std::string& policyDir, const std::string& partnersDir,
                PolicyObserver& observer) {
  TeskAccessInterfaceImpl access;
  bool failed = false;
  const auto load = [&](auto step) {
    if (!CarryOn(observer, step)) failed = true;
  };

  SecpolicyInfo("Using policy dir " + policyDir);
  load([&] { LoadPolicyObjects(Join(policyDir, kObjectsDir), access, observer); });
  load([&] { CreateCheckAccessPolicyDomain(access); });
  load([&] { LoadPolicyDomains(Join(policyDir, kDomainsDir), access, observer); });
  load([&] { LoadPartnerPolicyDomains(partnersDir, access, observer); });
  ResolveWellKnownDomains(access, observer);
  // Tardisks are the host's own, whatever policy is loaded: always under the fixed root.
  load([&] { LoadPolicyTardisks(Join(kPolicyRoot, kTardisksDir), access, observer); });
  load([&] { LoadPolicyFileLabels(Join(policyDir, kFileLabelsDir), access, observer); });

  if (failed) RaiseError("There were some problems encountered in setting the policy");
  SecpolicyInfo("System security policy has been set successfully");
}

}  // namespace

void LoadPolicy(const std::string& policyDir) { LoadPolicy(policyDir, Nobody()); }

void LoadPolicy(const std::string& policyDir, PolicyObserver& observer) {
  LoadPolicy(policyDir, kPartnerDomainsDir, observer);
}

void LoadPolicyWithPartners(const std::string& policyDir, PolicyObserver& observer) {
  LoadPolicy(policyDir, Join(Join(policyDir, kDomainsDir), kPartnersDir), observer);
}

void LoadPolicyEarly(const std::string& earlyPolicyDir) {
  LoadPolicyEarly(earlyPolicyDir, Nobody());
}

void LoadPolicyEarly(const std::string& earlyPolicyDir, PolicyObserver& observer) {
  CarryOn(observer, [&] {
    TeskAccessInterfaceImpl access;
    SecpolicyInfo("Using early policy dir " + earlyPolicyDir);
    LoadPolicyObjects(Join(kPolicyRoot, kObjectsDir), access, observer);
    LoadPolicyDomains(Join(earlyPolicyDir, kDomainsDir), access, observer);
    LoadPolicyFileLabels(Join(kPolicyRoot, kFileLabelsDir), access, observer);
  });
}

void RestoreDomainEnforcement() { RestoreDomainEnforcement(Nobody()); }

void RestoreDomainEnforcement(PolicyObserver& observer) {
  CarryOn(observer, [] {
    TeskAccessInterfaceImpl access;
    SecpolicyInfo("Restoring domain enforcement");
    RestoreDomainEnforcement(access);
  });
}

void DisplayPolicy(const std::string& domainName) { DisplayPolicy(domainName, Nobody()); }

void DisplayPolicy(const std::string& domainName, PolicyObserver& observer) {
  TeskAccessInterfaceImpl access;
  DisplayPolicyDomains(access, domainName, observer);
  DisplayPolicyObjects(access);
  DisplayPolicyTardiskLabels(access, observer);
}

}  // namespace SecPolicy
