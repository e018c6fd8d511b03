#include <list>

#include "kitlibs/file.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/domain/domain_policy.h"
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
std::list<DomainPolicy> NameDomains(const std::string& dir, TeskAccessInterfaceImpl& access) {
  std::map<std::string, std::string> files;
  GetFileList(dir, files);

  const std::string prefix = dir == kPartnerDomainsDir ? kPartnerPrefix : "";
  std::list<DomainPolicy> domains;
  for (const auto& [path, file] : files) {
    const std::string name = prefix + file;
    domains.emplace_back(name, FindOrCreateDomain(name, access)).policyFile = path;
  }
  SecpolicyInfo("Parsed all domain names");
  return domains;
}

bool ParsePolicies(std::list<DomainPolicy>& domains, TeskAccessInterfaceImpl& access) {
  const bool parsed =
      ForEachCarryOn(domains, [&](DomainPolicy& domain) { domain.ParsePolicy(access); });
  if (parsed) {
    SecpolicyInfo("Domain policies parsed and syntax validated");
  } else {
    SecpolicyError("Error in parsing the policy for some domains");
  }
  return parsed;
}

// A domain that fails is only kept out of the kernel, which SetPolicies then reports.
void CheckConstraints(std::list<DomainPolicy>& domains, TeskAccessInterfaceImpl& access) {
  const bool checked = ForEachCarryOn(domains, [&](DomainPolicy& domain) {
    try {
      domain.CheckPolicyConstraints(access);
    } catch (const Braxo::Lib::BraxoException&) {
      domain.hasErrors = true;
      throw;
    }
  });
  if (checked) {
    SecpolicyInfo("Constraints check for domain policies succeeded");
  } else {
    SecpolicyError("Error in policy constraints check for some domains");
  }
}

bool SetPolicies(std::list<DomainPolicy>& domains, TeskAccessInterfaceImpl& access) {
  const bool set = ForEachCarryOn(domains, [&](DomainPolicy& domain) { domain.SetPolicy(access); });
  if (set) {
    SecpolicyInfo("Domain policies set");
  } else {
    SecpolicyError("Error in setting the policy for some domains");
  }
  return set;
}

}  // namespace

void LoadPolicyDomains(const std::string& dir, TeskAccessInterfaceImpl& access) {
  std::list<DomainPolicy> domains = NameDomains(dir, access);
  const bool parsed = ParsePolicies(domains, access);
  CheckConstraints(domains, access);
  // What was read before a bad line is installed too.
  const bool set = SetPolicies(domains, access);
  if (!parsed || !set) RaiseError("Failure in domain policy");
}

void LoadPartnerPolicyDomains(TeskAccessInterfaceImpl& access) {
  if (File_Exists(kPartnerDomainsDir) && File_IsDirectory(kPartnerDomainsDir)) {
    LoadPolicyDomains(kPartnerDomainsDir, access);
  }
}

}  // namespace SecPolicy
