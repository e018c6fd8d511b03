#include <cstdlib>

#include "braxo/misc/strcat.h"
#include "secpolicy/domain/domain_policy.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

void DisplayAllDomains(TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  bool failed = false;
  const unsigned int slots = access.GetMaxDomains();
  for (unsigned int id = 0; id < slots; ++id) {
    try {
      DisplayDomainPolicy(access, id, observer);
    } catch (const BraxoException&) {
      failed = true;
    }
  }
  if (failed) RaiseError("Error in displaying the policy for some domains");
}

}  // namespace

void DisplayPolicyDomains(TeskAccessInterfaceImpl& access, const std::string& domain) {
  DisplayPolicyDomains(access, domain, Nobody());
}

void DisplayPolicyDomains(TeskAccessInterfaceImpl& access, const std::string& domain,
                          PolicyObserver& observer) {
  DisplayHeader("Policy set in the kernel", "");
  if (domain.empty()) {
    DisplayAllDomains(access, observer);
    return;
  }
  const long id = std::strtol(domain.c_str(), nullptr, 10);
  DisplayDomainPolicy(access, static_cast<unsigned int>(id), observer);
}

void DisplayDomainPolicy(TeskAccessInterfaceImpl& access, unsigned int id) {
  DisplayDomainPolicy(access, id, Nobody());
}

void DisplayDomainPolicy(TeskAccessInterfaceImpl& access, unsigned int id,
                         PolicyObserver& observer) {
  std::string name;
  std::string level;
  unsigned int state = 0;
  unsigned int refCount = 0;
  unsigned int worldRefCount = 0;
  auto dflt = TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
  try {
    if (!access.GetCompleteDomainInfo(id, name, level, state, refCount, worldRefCount, dflt))
      return;
  } catch (const BraxoException& failure) {
    ReportError(StrCat("Failed to get policy for domain :", name, failure.what()), observer);
    return;
  }

  DisplayHeader(StrCat("Domain Name: ", name, " Domain ID :", id, " Enforcement Level: ", level),
                StrCat("State: ", state, " RefCount: ", refCount, " WorldRefCount: ", worldRefCount,
                       " defaultDom: ", static_cast<int>(dflt)));
  DomainPolicy policy(name, id);
  policy.ReadSystemPolicy(access, observer);
  policy.PrintPolicy();
}

}  // namespace SecPolicy
