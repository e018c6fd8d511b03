#pragma once

#include <cstdint>
#include <string>

namespace SecPolicyCli {

// The time, in seconds since 1970, as "2026-11-21 07:00:00 UTC".
std::string UtcTime(std::int64_t seconds);

}  // namespace SecPolicyCli
