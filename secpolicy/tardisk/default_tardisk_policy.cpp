#include "braxo/misc/strcat.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

using Braxo::Lib::BraxoException;

// Runs `step`; a failure is reported in two lines, `heading` and its message. Returns whether it
// succeeded.
template <class Step>
bool TryDefault(const char* heading, PolicyObserver& observer, Step step) {
  try {
    step();
    return true;
  } catch (const BraxoException& failure) {
    ReportError(heading, observer);
    ReportError(failure.what(), observer);
    return false;
  }
}

}  // namespace

void SetDefaultTardiskPolicy(std::list<std::string>& tardisks, TeskAccessInterfaceImpl& access) {
  SetDefaultTardiskPolicy(tardisks, access, Nobody());
}

void SetDefaultTardiskPolicy(const std::list<std::string>& tardisks,
                             TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  const std::string defaultLabel = access.GetDefaultTardiskLabel();
  const std::string defaultDomain = access.GetDefaultTardiskDomain();
  const std::vector<std::string> launchDomains = access.GetTardiskLaunchDomains();
  const std::string eventKeyword = access.GetTardiskExecEventKeyword();
  const unsigned int defaultDomainId = GetDefaultTardiskDomain();

  bool failed = false;
  for (const std::string& launchDomain : launchDomains) {
    unsigned int launchDomainId = 0;
    if (!access.FindDomain(launchDomain, &launchDomainId)) {
      RaiseError("Failed to fetch domain id for " + launchDomain);
    }
    if (launchDomainId == defaultDomainId) continue;
    const bool set = TryDefault("Failed to set default tardisk rule: ", observer, [&] {
      access.SetDomTransRule({.line = 0,
                              .domainId = launchDomainId,
                              .domainName = launchDomain,
                              .label = defaultLabel,
                              .targetDomain = defaultDomain,
                              .targetDomainId = defaultDomainId,
                              .transitionKind = eventKeyword,
                              .grant = true});
    });
    if (!set) failed = true;
  }

  for (const std::string& tardisk : tardisks) {
    const bool set = TryDefault("Failed to set default tardisk label: ", observer,
                                [&] { SetFileLabel(tardisk, defaultLabel, access); });
    if (!set) failed = true;
  }
  if (failed) RaiseError("Failure in setting default tardisk policy");
}

}  // namespace SecPolicy
