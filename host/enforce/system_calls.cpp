#include "host/enforce/system_calls.h"

#include <seccomp.h>

#include <algorithm>
#include <cstdlib>
#include <vector>

#include "policy/newer_call.h"

namespace Enforce {
namespace {

constexpr int kLastNumber = 639;  // some 470 are in use, and they grow by a few a year

std::string NewerName(int number) {
  const auto calls = Policy::NewerCalls();
  const auto call = std::ranges::find(calls, number, &Policy::NewerCall::number);
  return call == calls.end() ? std::string() : std::string(call->name);
}

std::string ReadName(std::uint32_t architecture, int number) {
  char* const known = seccomp_syscall_resolve_num_arch(architecture, number);
  if (known == nullptr) return NewerName(number);
  std::string name = known;
  std::free(known);
  return name;
}

std::vector<SystemCall> ReadAll(std::uint32_t architecture) {
  std::vector<SystemCall> calls;
  for (int number = 0; number <= kLastNumber; ++number) {
    std::string name = ReadName(architecture, number);
    if (!name.empty()) calls.push_back({number, std::move(name)});
  }
  return calls;
}

std::vector<const SystemCall*> SortByName(std::span<const SystemCall> calls) {
  std::vector<const SystemCall*> byName;
  for (const SystemCall& call : calls) byName.push_back(&call);
  std::ranges::sort(byName, {}, &SystemCall::name);
  return byName;
}

}  // namespace

std::span<const SystemCall> SystemCalls() {
  static const std::vector<SystemCall> calls = ReadAll(SCMP_ARCH_NATIVE);
  return calls;
}

std::span<const SystemCall> SystemCallsOf32Bits() {
  const bool isArm = seccomp_arch_native() == SCMP_ARCH_AARCH64;
  static const std::vector<SystemCall> calls = ReadAll(isArm ? SCMP_ARCH_ARM : SCMP_ARCH_X86);
  return calls;
}

std::optional<int> NumberOf(std::string_view name) {
  static const std::vector<const SystemCall*> byName = SortByName(SystemCalls());
  const auto call = std::ranges::lower_bound(
      byName, name, {}, [](const SystemCall* each) { return std::string_view(each->name); });
  if (call == byName.end() || (*call)->name != name) return std::nullopt;
  return (*call)->number;
}

std::string_view NameOf(int number) {
  const auto calls = SystemCalls();
  const auto call = std::ranges::lower_bound(calls, number, {}, &SystemCall::number);
  if (call == calls.end() || call->number != number) return {};
  return call->name;
}

std::uint32_t NativeArchitecture() { return seccomp_arch_native(); }

}  // namespace Enforce
