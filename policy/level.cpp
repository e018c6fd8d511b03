#include "policy/level.h"

#include <cstddef>

namespace Policy {
namespace {

constexpr std::array kWords = {"enforcing", "permissive", "disabled"};
static_assert(kWords.size() == kLevels.size());

}  // namespace

const char* TextOf(Level level) { return kWords.at(static_cast<std::size_t>(level)); }

std::optional<Level> FindLevel(std::string_view word) {
  for (const Level level : kLevels) {
    if (TextOf(level) == word) return level;
  }
  return std::nullopt;
}

}  // namespace Policy
