#pragma once

#include <cstddef>
#include <string>

namespace SecPolicyCli {

// "1 file", "2 files".
std::string CountOf(std::size_t count, const std::string& noun);

}  // namespace SecPolicyCli
