#pragma once

#include <string>

namespace SecPolicyCli {

// The path that it resolves to; empty when it leads nowhere.
std::string RealPathOf(const std::string& path);

}  // namespace SecPolicyCli
