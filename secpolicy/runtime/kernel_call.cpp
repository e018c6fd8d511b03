#include "secpolicy/runtime/kernel_call.h"

#include <cerrno>
#include <cstring>

#include "zorvan/kernel.h"

namespace SecPolicy {

std::string KernelCallOutcome::Reason() const { return std::strerror(error); }

KernelCallOutcome CallKernel(KernelCallNumber number, std::initializer_list<std::uint64_t> args) {
  const auto result = Zorvan::Kernel::Call(static_cast<std::uint32_t>(number), args);
  if (result.error != 0) errno = -result.error;
  return {result.status, errno};
}

std::uint64_t Address(const void* pointer) { return reinterpret_cast<std::uintptr_t>(pointer); }

std::uint64_t SignExtended(std::int64_t value) { return static_cast<std::uint64_t>(value); }

}  // namespace SecPolicy
