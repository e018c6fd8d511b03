#pragma once

#include <cstddef>
#include <string_view>

#include "bundle/archive.h"

namespace SecPolicyCli {

// Many times what a policy of a hundred thousand rules has; a host reads it as a whole.
inline constexpr std::size_t kLargestBundle = std::size_t{64} << 20;

inline constexpr char kManifestName[] = "manifest.json";
inline constexpr char kSignatureName[] = "manifest.sig";

// What stands before the names of a policy's files in a bundle.
inline constexpr std::string_view kPolicyPrefix = "policy/";

inline constexpr std::size_t kLongestPolicyFile = kLongestEntryName - kPolicyPrefix.size();

}  // namespace SecPolicyCli
