#pragma once

#include <string>
#include <string_view>

namespace LinuxHost {

// The text with "%XX" for each byte that is no letter, no digit and none of `marks`.
std::string PercentEncoded(std::string_view text, std::string_view marks);

}  // namespace LinuxHost
