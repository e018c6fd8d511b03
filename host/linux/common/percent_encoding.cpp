#include "host/linux/common/percent_encoding.h"

namespace LinuxHost {
namespace {

bool IsLetterOrDigit(char byte) {
  return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') ||
         (byte >= '0' && byte <= '9');
}

}  // namespace

std::string PercentEncoded(std::string_view text, std::string_view marks) {
  constexpr char kDigits[] = "0123456789ABCDEF";
  std::string encoded;
  for (const char letter : text) {
    if (IsLetterOrDigit(letter) || marks.find(letter) != std::string_view::npos) {
      encoded += letter;
      continue;
    }
    const auto byte = static_cast<unsigned char>(letter);
    encoded += '%';
    encoded += kDigits[byte >> 4];
    encoded += kDigits[byte & 0xf];
  }
  return encoded;
}

}  // namespace LinuxHost
