#pragma once

#include <cstdint>
#include <string>

namespace Policy {

// The values that a parameter check is about, both ends included.
struct ParameterRange {
  std::uint64_t first = 0;
  std::uint64_t last = 0;

  bool Overlaps(const ParameterRange& other) const {
    return first <= other.last && other.first <= last;
  }
};

// Reads the range from the words of a rule: unsigned numbers, decimal or hexadecimal with "0x".
// Without `lastWord` the range is one value. Throws BraxoException for anything else.
ParameterRange ParseParameterRange(const std::string& firstWord, const std::string& lastWord);

}  // namespace Policy
