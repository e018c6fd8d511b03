#pragma once

#include <string>
#include <string_view>

namespace LinuxHost {

// The SHA-256 of the text, in hexadecimal digits.
std::string DigestOf(std::string_view text);

}  // namespace LinuxHost
