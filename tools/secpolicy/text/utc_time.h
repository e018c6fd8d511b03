#pragma once

#include <cstdint>
#include <string>

namespace SecPolicyCli {

// The time, in seconds since 1970, for people: "2026-11-21 07:00:00 UTC".
std::string UtcTime(std::int64_t seconds);

// The same for programs, as ISO 8601 has it: "2026-11-21T07:00:00Z".
std::string IsoTime(std::int64_t seconds);

}  // namespace SecPolicyCli
