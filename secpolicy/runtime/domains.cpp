#include <array>
#include <cstring>

#include "braxo/misc/strcat.h"
#include "secpolicy/report.h"
#include "secpolicy/runtime/kernel_call.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

using Braxo::Misc::StrCat;

constexpr std::size_t kDomainNameSize = 64;

}  // namespace

unsigned int CreateDomain(const std::string& name, TeskAccessKsi_DefaultDom dflt) {
  // The kernel makes a domain only for a process that is connected to it.
  const TeskAccessInterfaceImpl access;
  if (name.empty()) RaiseError("Must specify domain name");
  std::uint32_t id = 0;
  const auto outcome = CallKernel(KernelCallNumber::kCreateDomain,
                                  {Address(name.c_str()), SignExtended(dflt), Address(&id)});
  if (outcome.Failed()) {
    RaiseError(StrCat("Failed to create domain:", name, " :", outcome.Reason()));
  }
  return id;
}

void DestroyDomain(unsigned int id) {
  const TeskAccessInterfaceImpl access;
  const auto outcome = CallKernel(KernelCallNumber::kDestroyDomain, {id});
  if (outcome.Failed()) RaiseError("Failed to destroy domain: " + outcome.Reason());
}

void AddGcomService(unsigned int id, const std::string& service) {
  TeskAccessInterfaceImpl access;
  if (service.empty()) RaiseError("Must specify service string");
  access.AddGcomService(id, service);
}

void RetrieveLeakedDomains(unsigned long capacity, unsigned int* count, unsigned int* ids) {
  const auto outcome = CallKernel(KernelCallNumber::kRetrieveLeakedDomains,
                                  {Address(ids), Address(count), capacity});
  if (outcome.Failed()) RaiseError("Failed to retrieve leaked domain list:" + outcome.Reason());
}

unsigned int GetDomainIDForWorld(int world) {
  std::uint32_t id = 0;
  const auto outcome =
      CallKernel(KernelCallNumber::kGetDomainIdForWorld, {SignExtended(world), Address(&id)});
  if (outcome.Failed()) RaiseError("Unable to get domain ID: " + outcome.Reason());
  return id;
}

std::string GetDomainNameForID(unsigned int id) {
  std::array<char, kDomainNameSize> name{};
  const auto outcome =
      CallKernel(KernelCallNumber::kGetDomainNameForId, {id, Address(name.data()), name.size()});
  if (outcome.Failed()) RaiseError("Unable to get domain name: " + outcome.Reason());
  return {name.data(), strnlen(name.data(), name.size())};
}

}  // namespace SecPolicy
