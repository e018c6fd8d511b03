#pragma once

#include <sys/types.h>

#include <cstdint>
#include <optional>

// Processes of others, by their numbers.
namespace LinuxHost {

bool IsAlive(int process);

// When the process was started, in clock ticks since boot: tells it from a later one with the same
// number. 0 where it cannot be told.
std::int64_t StartOf(int process);

// True for a living process that was started then.
bool IsStill(int process, std::int64_t started);

// The user whose process it is by all its identities; nothing where there are several, or it cannot
// be told.
std::optional<uid_t> OwnerOf(int process);

}  // namespace LinuxHost
