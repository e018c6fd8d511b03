#include <memory>

#include "secpolicy/carry_on.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

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
                        TeskAccessInterfaceImpl& access) {
  OwnedPolicies owned;
  GetTardiskLists(dir, owned.policies, unmatched);
  return CarryOn([&] { ParseAndSetTardiskPolicy(owned.policies, access); });
}

}  // namespace

void ParseAndSetTardiskPolicy(std::list<TardiskPolicy*> policies, TeskAccessInterfaceImpl& access) {
  const bool parsed =
      ForEachCarryOn(policies, [&](TardiskPolicy* policy) { policy->ParsePolicy(access); });
  if (parsed) {
    SecpolicyInfo("Parsed all the tardisk policy files");
  } else {
    SecpolicyError("Error in parsing some tardisk policy files");
  }

  // What was read before a bad line is applied too.
  const bool set =
      ForEachCarryOn(policies, [&](TardiskPolicy* policy) { policy->SetPolicy(access); });
  if (set) {
    SecpolicyInfo("Set all the tardisk labels and policy");
  } else {
    SecpolicyError("Error in setting some tardisk labels and policy");
  }
  if (!parsed || !set) RaiseError("Failure in setting specified tardisk policy");
}

void LoadPolicyTardisks(const std::string& dir, TeskAccessInterfaceImpl& access) {
  std::list<std::string> unmatched;
  const bool specified = SetSpecifiedPolicy(dir, unmatched, access);
  const bool byDefault = CarryOn([&] { SetDefaultTardiskPolicy(unmatched, access); });
  if (!specified || !byDefault) RaiseError("Failure in setting tardisk policy");
}

}  // namespace SecPolicy
