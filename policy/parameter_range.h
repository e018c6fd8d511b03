#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace Policy {

// The values that a parameter check is about, both ends included.
struct ParameterRange {
  std::uint64_t first = 0;
  std::uint64_t last = 0;

  bool Overlaps(const ParameterRange& other) const {
    return first <= other.last && other.first <= last;
  }
};

// The check whose value is a mask: bits that may be set together. All others are about a number.
inline constexpr std::string_view kMaskCheck = "clone_flags";

// The bits that it is about; the lowest eight are the signal of a child.
inline constexpr std::uint64_t kMaskCheckBits = ~std::uint64_t{0xff};

// Reads the range from the words of a rule: unsigned numbers, decimal or hexadecimal with "0x".
// Without `lastWord` the range is one value. Throws BraxoException for anything else.
ParameterRange ParseParameterRange(const std::string& firstWord, const std::string& lastWord);

}  // namespace Policy
