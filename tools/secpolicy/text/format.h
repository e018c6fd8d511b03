#pragma once

#include <cstddef>
#include <cstdint>
#include <iosfwd>
#include <optional>
#include <string>
#include <vector>

#include "terminal/color.h"

namespace SecPolicyCli {

// "1 file", "2 files".
std::string CountOf(std::size_t count, const std::string& noun);

// "A, B and C", where `last` is "and". There is one word at least.
std::string ListOf(const std::vector<std::string>& words, const std::string& last);

// The time, in seconds since 1970, for people: "2026-11-21 07:00:00 UTC".
std::string UtcTime(std::int64_t seconds);

// The same for programs, as ISO 8601 has it: "2026-11-21T07:00:00Z".
std::string IsoTime(std::int64_t seconds);

// Writes a heading with the number of `lines`, and at most `maximum` of them, as they can be shown,
// in `color`, if any; nothing when there are none.
void WriteSection(const std::string& heading, const std::vector<std::string>& lines,
                  std::size_t maximum, std::ostream& output,
                  std::optional<Color> color = std::nullopt);

}  // namespace SecPolicyCli
