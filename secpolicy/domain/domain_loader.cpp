#include <list>

#include "kitlibs/file.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/domain/domain_policy.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

unsigned int FindOrCreateDomain(const std::string& name, TeskAccessInterfaceImpl& access) {
  unsigned int id = 0;
  if (access.FindDomain(name, &id)) return id;
  return access.CreateDomain(name, TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
}

// All names exist before the first policy is parsed, so that domains can refer to each other.
std::list<DomainPolicy> NameDomains(const std::string& dir, const std::string& prefix,
                                    TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  std::map<std::string, std::string> files;
  TellFailure(dir, observer, [&] { GetFileList(dir, files); });

  std::list<DomainPolicy> domains;
  for (const auto& [path, file] : files) {
    const std::string name = prefix + file;
    unsigned int id = 0;
    TellFailure(path, observer, [&] { id = FindOrCreateDomain(name, access); });
    domains.emplace_back(name, id).policyFile = path;
  }
  SecpolicyInfo("Parsed all domain names");
  return domains;
}

bool ParsePolicies(std::list<DomainPolicy>& domains, TeskAccessInterfaceImpl& access,
                   PolicyObserver& observer) {
  const bool parsed = ForEachCarryOn(
      domains, observer, [&](DomainPolicy& domain) { domain.ParsePolicy(access, observer); });
  if (parsed) {
    SecpolicyInfo("Domain policies parsed and syntax validated");
  } else {
    ReportError("Error in parsing the policy for some domains", observer);
  }
  return parsed;
}

// A domain that fails is only kept out of the kernel, which SetPolicies then reports.
void CheckConstraints(std::list<DomainPolicy>& domains, TeskAccessInterfaceImpl& access,
                      PolicyObserver& observer) {
  const bool checked = ForEachCarryOn(domains, observer, [&](DomainPolicy& domain) {
    try {
      TellFailure(domain.policyFile, observer, [&] { domain.CheckPolicyConstraints(access); });
    } catch (const Braxo::Lib::BraxoException&) {
      domain.hasErrors = true;
      throw;
    }
  });
  if (checked) {
    SecpolicyInfo("Constraints check for domain policies succeeded");
  } else {
    ReportError("Error in policy constraints check for some domains", observer);
  }
}

bool SetPolicies(std::list<DomainPolicy>& domains, TeskAccessInterfaceImpl& access,
                 PolicyObserver& observer) {
  const bool set = ForEachCarryOn(
      domains, observer, [&](DomainPolicy& domain) { domain.SetPolicy(access, observer); });
  if (set) {
    SecpolicyInfo("Domain policies set");
  } else {
    ReportError("Error in setting the policy for some domains", observer);
  }
  return set;
}

void LoadDomains(const std::string& dir, LoadPhase which, TeskAccessInterfaceImpl& access,
                 PolicyObserver& observer) {
  const PhaseOfLoad phase(which, observer);
  const std::string prefix = which == LoadPhase::kPartnerDomains ? kPartnerPrefix : "";
  std::list<DomainPolicy> domains = NameDomains(dir, prefix, access, observer);
  const bool parsed = ParsePolicies(domains, access, observer);
  CheckConstraints(domains, access, observer);
  // What was read before a bad line is installed too.
  const bool set = SetPolicies(domains, access, observer);
  if (!parsed || !set) RaiseError("Failure in domain policy");
}

}  // namespace

void LoadPolicyDomains(const std::string& dir, TeskAccessInterfaceImpl& access) {
  LoadPolicyDomains(dir, access, Nobody());
}

void LoadPolicyDomains(const std::string& dir, TeskAccessInterfaceImpl& access,
                       PolicyObserver& observer) {
  const bool isOfPartners = dir == kPartnerDomainsDir;
  LoadDomains(dir, isOfPartners ? LoadPhase::kPartnerDomains : LoadPhase::kDomains, access,
              observer);
}

void LoadPartnerPolicyDomains(TeskAccessInterfaceImpl& access) {
  LoadPartnerPolicyDomains(kPartnerDomainsDir, access, Nobody());
}

void LoadPartnerPolicyDomains(const std::string& dir, TeskAccessInterfaceImpl& access,
                              PolicyObserver& observer) {
  if (File_Exists(dir.c_str()) && File_IsDirectory(dir.c_str())) {
    LoadDomains(dir, LoadPhase::kPartnerDomains, access, observer);
  }
}

}  // namespace SecPolicy
