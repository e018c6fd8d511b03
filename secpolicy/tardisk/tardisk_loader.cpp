#include <memory>

#include "secpolicy/carry_on.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"
#include "secpolicy/tardisk/tardisk_policy_steps.h"

namespace SecPolicy {
namespace {

// Owns the policies that the discovery hands out as plain pointers, also while it fails half-way.
class OwnedPolicies {
 public:
  OwnedPolicies() = default;
  OwnedPolicies(const OwnedPolicies&) = delete;
  OwnedPolicies& operator=(const OwnedPolicies&) = delete;
  ~OwnedPolicies() {
    for (const TardiskPolicy* policy : policies) delete policy;
  }

  std::list<TardiskPolicy*> policies;
};

// Applies the policies of `dir` and collects the tardisks without one. Returns whether all policies
// were read and applied; they are gone before the default policy is looked at.
bool SetSpecifiedPolicy(const std::string& dir, std::list<std::string>& unmatched,
                        TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  OwnedPolicies owned;
  GetTardiskLists(dir, owned.policies, unmatched, observer);
  return CarryOn(observer, [&] { ParseAndSetTardiskPolicy(owned.policies, access, observer); });
}

}  // namespace

void ParseAndSetTardiskPolicy(std::list<TardiskPolicy*> policies, TeskAccessInterfaceImpl& access) {
  ParseAndSetTardiskPolicy(policies, access, Nobody());
}

void ParseAndSetTardiskPolicy(const std::list<TardiskPolicy*>& policies,
                              TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  const bool parsed = ForEachCarryOn(policies, observer, [&](TardiskPolicy* policy) {
    TardiskPolicySteps(*policy, observer).ParsePolicy(access);
  });
  if (parsed) {
    SecpolicyInfo("Parsed all the tardisk policy files");
  } else {
    ReportError("Error in parsing some tardisk policy files", observer);
  }

  // What was read before a bad line is applied too.
  const bool set = ForEachCarryOn(policies, observer, [&](TardiskPolicy* policy) {
    TardiskPolicySteps(*policy, observer).SetPolicy(access);
  });
  if (set) {
    SecpolicyInfo("Set all the tardisk labels and policy");
  } else {
    ReportError("Error in setting some tardisk labels and policy", observer);
  }
  if (!parsed || !set) RaiseError("Failure in setting specified tardisk policy");
}

void LoadPolicyTardisks(const std::string& dir, TeskAccessInterfaceImpl& access) {
  LoadPolicyTardisks(dir, access, Nobody());
}

void LoadPolicyTardisks(const std::string& dir, TeskAccessInterfaceImpl& access,
                        PolicyObserver& observer) {
  const PhaseOfLoad phase(LoadPhase::kTardisks, observer);
  std::list<std::string> unmatched;
  const bool specified = SetSpecifiedPolicy(dir, unmatched, access, observer);
  const bool byDefault =
      CarryOn(observer, [&] { SetDefaultTardiskPolicy(unmatched, access, observer); });
  if (!specified || !byDefault) RaiseError("Failure in setting tardisk policy");
}

}  // namespace SecPolicy
