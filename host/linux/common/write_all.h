#pragma once

#include <string_view>

namespace LinuxHost {

// Writes all of `bytes` to the file, however many calls that takes. False, with errno, when that
// cannot be done; a part may have been written then.
bool WriteAll(int descriptor, std::string_view bytes);

}  // namespace LinuxHost
