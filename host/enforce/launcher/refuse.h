#pragma once

#include <cstdint>
#include <string>

namespace Enforce {

// As a shell has them.
inline constexpr int kRefused = 126;
inline constexpr int kNotFound = 127;

// Ends the process before it has started anything; `message` says what failed and what to do, on
// one line. Defined by the program that enters.
[[noreturn]] void Refuse(const std::string& message, int exitStatus = kRefused);

// The same for a system call that has just failed: "MESSAGE: SYSTEM ERROR".
[[noreturn]] void RefuseForErrno(const std::string& message);

// The beginning of that line, for a time when this process can be refused more memory, and when
// only calls with `secret` may pass.
std::string PrepareRefusal(const std::string& message);
[[noreturn]] void RefuseForErrno(std::string prepared, std::uint64_t secret);

}  // namespace Enforce
