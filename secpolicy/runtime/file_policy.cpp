#include "braxo/misc/strcat.h"
#include "secpolicy/report.h"
#include "secpolicy/runtime/kernel_call.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

using Braxo::Misc::StrCat;

// The kernel's answer when the policies changed since they were counted.
constexpr std::uint32_t kTryAgain = 0xbad011f;

}  // namespace

void AddFilePolicyBatch(int world, unsigned int domainId, TeskAccess_FileRule* rules,
                        unsigned int count, unsigned int* result) {
  const auto outcome =
      CallKernel(KernelCallNumber::kAddFilePolicyBatch,
                 {SignExtended(world), domainId, Address(rules), count, Address(result)});
  if (outcome.Failed()) {
    RaiseError(StrCat("Failed to add file policies to domain :", domainId, ": world ID :", world,
                      ":", outcome.Reason()));
  }
}

void RemoveFilePolicy(int world, unsigned int domainId, const std::string& path) {
  if (path.empty()) RaiseError("file path is empty");
  const auto outcome = CallKernel(KernelCallNumber::kRemoveFilePolicy,
                                  {SignExtended(world), domainId, Address(path.c_str())});
  if (outcome.Failed()) {
    RaiseError(StrCat("Failed to remove file policy from domain :", domainId,
                      " : world id :", world, ":", outcome.Reason()));
  }
}

void UpdateFilePolicy(unsigned int domainId, const std::string& path, unsigned int mode) {
  if (path.empty()) RaiseError("File path is empty");
  const auto outcome =
      CallKernel(KernelCallNumber::kUpdateFilePolicy, {domainId, Address(path.c_str()), mode});
  if (outcome.Failed()) {
    RaiseError(StrCat("Failed to update file policy: ", path, ":", outcome.Reason()));
  }
}

unsigned int RetrieveNumberOfFilePolicies(unsigned int domainId) {
  std::uint32_t count = 0;
  const auto outcome =
      CallKernel(KernelCallNumber::kRetrieveNumberOfFilePolicies, {domainId, Address(&count)});
  if (outcome.Failed()) {
    RaiseError(StrCat("Failed to get number of file policies for domain :: ", domainId, ":",
                      outcome.Reason()));
  }
  return count;
}

void RetrieveFilePolicies(unsigned int domainId, TeskAccess_FileRule* buffer,
                          unsigned int capacity) {
  const auto outcome =
      CallKernel(KernelCallNumber::kRetrieveFilePolicies, {domainId, Address(buffer), capacity});
  if (!outcome.Failed()) return;
  const std::string message =
      StrCat("Failed to retrieve policies from domain:: ", domainId, " : ", outcome.Reason());
  if (outcome.status == kTryAgain) throw SecPolicyRetryException(message);
  RaiseError(message);
}

void ReplaceFilePolicyVMs(const std::string& oldPath, const std::string& newPath) {
  if (oldPath.empty()) RaiseError("Old path is empty");
  if (newPath.empty()) RaiseError("New path is empty");
  const auto outcome = CallKernel(KernelCallNumber::kReplaceFilePolicyVMs,
                                  {Address(oldPath.c_str()), Address(newPath.c_str())});
  if (outcome.Failed()) {
    RaiseError(StrCat("Failed to replace file policy: ", oldPath, " to: ", newPath, ": ",
                      outcome.Reason()));
  }
}

}  // namespace SecPolicy
