#pragma once

#include <charconv>
#include <optional>
#include <string_view>

namespace Enforce {

// The decimal number, not negative, that `text` is; nothing when it is anything else.
inline std::optional<int> ReadNumber(std::string_view text) {
  int number = 0;
  const auto [end, error] = std::from_chars(text.begin(), text.end(), number);
  if (error != std::errc() || end != text.end() || number < 0) return std::nullopt;
  return number;
}

}  // namespace Enforce
