#pragma once

#include <linux/filter.h>

#include <cerrno>
#include <compare>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <vector>

#include "host/enforce/plan/entry_secret.h"
#include "host/enforce/plan/value_set.h"

// Filters of system calls, as the kernel takes them from seccomp(2).
namespace Enforce {

enum class Half { kLower, kUpper };

// Passes when the masked half of an argument is one of the values.
struct ArgumentCheck {
  unsigned int argument = 0;  // counted from 0
  std::uint32_t mask = 0xffff'ffff;
  Half half = Half::kLower;
  std::vector<ValueRange> values = {};  // as a ValueSet has them

  auto operator<=>(const ArgumentCheck&) const = default;
};

// Holds when at least one of its checks passes.
using Condition = std::vector<ArgumentCheck>;

enum class Answer {
  kUnknown,  // ENOSYS, as from a kernel that does not have the call
  kRefused,
  kAllowed,            // where all conditions hold, else refused
  kAllowedWithSecret,  // where the last argument is the secret, else EPERM; without conditions
  kNoticed,            // as its supervisor says, whom the filter's listener tells of it
};

struct CallVerdict {
  Answer answer = Answer::kRefused;
  std::vector<Condition> conditions = {};
  int refusal = EPERM;  // the error that it refuses with

  auto operator<=>(const CallVerdict&) const = default;
};

struct FilterProgram {
  std::vector<sock_filter> instructions;
  std::optional<SecretPlaces> secret;  // where a call is allowed with it
};

// The longest program that the kernel takes.
constexpr std::size_t kMostInstructions = BPF_MAXINSNS;

// The program that answers each call by its number as `calls` says, and all others as unknown. It
// kills a process that calls by another architecture than `architecture` (AUDIT_ARCH_...), which
// has other numbers, or by the second table of numbers that x86_64 has. Until SetSecret no secret
// passes. Whether the kernel takes as many instructions is for the caller to see.
FilterProgram Assemble(const std::map<int, CallVerdict>& calls, std::uint32_t architecture);

}  // namespace Enforce
