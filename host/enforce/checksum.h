#pragma once

#include <cstdint>
#include <cstring>
#include <string_view>

namespace Enforce {

// Of what is kept in a file. Each word changes the sum in a way that no later word takes back, so a
// single changed byte is always noticed. Against malice stands the owner of the file.
inline std::uint64_t Checksum(std::string_view bytes) {
  constexpr std::uint64_t kFactor = 0x9e37'79b9'7f4a'7c15;
  std::uint64_t sum = bytes.size();
  const auto take = [&](std::uint64_t word) {
    sum = (sum ^ word) * kFactor;
    sum ^= sum >> 32;
  };
  while (bytes.size() >= sizeof(std::uint64_t)) {
    std::uint64_t word = 0;
    std::memcpy(&word, bytes.data(), sizeof word);
    take(word);
    bytes.remove_prefix(sizeof word);
  }
  std::uint64_t rest = 0;
  std::memcpy(&rest, bytes.data(), bytes.size());
  take(rest);
  return sum;
}

}  // namespace Enforce
