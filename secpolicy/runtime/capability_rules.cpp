#include "braxo/misc/strcat.h"
#include "secpolicy/report.h"
#include "secpolicy/runtime/kernel_call.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

using Braxo::Misc::StrCat;

constexpr unsigned int kLastCapability = 18;
constexpr unsigned int kLastParamCheck = 9;

// Plain `char` has no sign on some machines; the kernel expects it to have one everywhere.
std::uint64_t GrantArgument(char grant) { return SignExtended(static_cast<signed char>(grant)); }

void CheckParamCheckArguments(TeskAccess_ParamCheck check, const TeskAccess_ModeParam* mode) {
  if (check > kLastParamCheck) RaiseError("ParamCheck is not in range");
  if (mode == nullptr) RaiseError("Mode Param is NULL");
}

}  // namespace

void SetCapRule(unsigned int domainId, TeskAccess_Capability capability, char grant) {
  if (capability > kLastCapability) RaiseError("Capability is not in range");
  const auto outcome = CallKernel(KernelCallNumber::kSetCapabilityRule,
                                  {domainId, capability, GrantArgument(grant)});
  if (outcome.Failed()) {
    RaiseError(
        StrCat("Failed to set capability rule for domain :: ", domainId, ":", outcome.Reason()));
  }
}

void SetParamCheckRule(unsigned int domainId, TeskAccess_ParamCheck check,
                       const TeskAccess_ModeParam* mode, char grant) {
  CheckParamCheckArguments(check, mode);
  const auto outcome = CallKernel(KernelCallNumber::kSetParamCheckRule,
                                  {domainId, check, Address(mode), GrantArgument(grant)});
  if (outcome.Failed()) {
    RaiseError(StrCat("Failed to set parameter check rule for domain :: ", domainId, ":",
                      outcome.Reason()));
  }
}

void RemoveParamCheckRule(unsigned int domainId, TeskAccess_ParamCheck check,
                          const TeskAccess_ModeParam* mode) {
  CheckParamCheckArguments(check, mode);
  const auto outcome =
      CallKernel(KernelCallNumber::kRemoveParamCheckRule, {domainId, check, Address(mode)});
  if (outcome.Failed()) {
    RaiseError(StrCat("Failed to remove parameter check rule for domain :: ", domainId, ":",
                      outcome.Reason()));
  }
}

}  // namespace SecPolicy
