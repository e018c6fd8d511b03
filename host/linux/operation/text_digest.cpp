#include "host/linux/operation/text_digest.h"

#include <sha2.h>

#include <array>
#include <cstdint>

namespace LinuxHost {

std::string DigestOf(std::string_view text) {
  std::array<char, SHA256_DIGEST_STRING_LENGTH> digits{};
  SHA256Data(reinterpret_cast<const std::uint8_t*>(text.data()), text.size(), digits.data());
  return digits.data();
}

}  // namespace LinuxHost
