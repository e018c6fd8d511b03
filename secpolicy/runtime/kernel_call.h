#pragma once

#include <cstdint>
#include <initializer_list>
#include <string>

namespace SecPolicy {

// The numbered calls of the access-control module.
enum class KernelCallNumber : std::uint32_t {
  kCreateDomain = 0x4059,
  kDestroyDomain = 0x405a,
  kUpdateFilePolicy = 0x405b,
  kRemoveFilePolicy = 0x405c,
  kRetrieveFilePolicies = 0x405d,
  kRetrieveNumberOfFilePolicies = 0x405e,
  kAddFilePolicyBatch = 0x405f,
  kSetCapabilityRule = 0x4061,
  kSetParamCheckRule = 0x4062,
  kRetrieveLeakedDomains = 0x4064,
  kGetDomainIdForWorld = 0x4065,
  kGetDomainNameForId = 0x4066,
  kReplaceFilePolicyVMs = 0x4067,
  kRemoveParamCheckRule = 0x413e,  // came later, outside the block of the others
};

// What a kernel call left.
struct KernelCallOutcome {
  std::uint32_t status;
  int error;  // errno after the call

  bool Failed() const { return status != 0; }

  // The system's text for the error.
  std::string Reason() const;
};

// Makes the call. A non-zero error value of the kernel becomes errno, also when the call succeeded;
// errno is not touched otherwise.
KernelCallOutcome CallKernel(KernelCallNumber number, std::initializer_list<std::uint64_t> args);

// Arguments as they travel: pointers as addresses, signed values sign-extended.
std::uint64_t Address(const void* pointer);
std::uint64_t SignExtended(std::int64_t value);

}  // namespace SecPolicy
