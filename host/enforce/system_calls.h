#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

// The system calls of the architecture that this is compiled for.
namespace Enforce {

struct SystemCall {
  int number;
  std::string name;
};

// Every known one, in ascending order of their numbers. It lives as long as the program.
std::span<const SystemCall> SystemCalls();

// Those that programs of 32 bits have on this machine, likewise.
std::span<const SystemCall> SystemCallsOf32Bits();

// The number of the system call with this name; nothing when this architecture has none.
std::optional<int> NumberOf(std::string_view name);

// The name of the system call with this number; empty when none is known.
std::string_view NameOf(int number);

// The architecture as the kernel tells it to filters: AUDIT_ARCH_X86_64 and the like.
std::uint32_t NativeArchitecture();

}  // namespace Enforce
