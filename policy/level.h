#pragma once

#include <array>
#include <optional>
#include <string_view>

namespace Policy {

// How a domain's rules are enforced.
enum class Level {
  kEnforcing,   // what no rule grants is refused
  kPermissive,  // it is only logged
  kDisabled,
};

// Every level, the one that a domain begins with first.
inline constexpr std::array kLevels = {Level::kEnforcing, Level::kPermissive, Level::kDisabled};

// The word of a level: "enforcing".
const char* TextOf(Level level);

// The level with this word; nothing when there is none.
std::optional<Level> FindLevel(std::string_view word);

}  // namespace Policy
