#pragma once

#include <algorithm>
#include <array>
#include <string_view>

namespace LinuxHost {

// Directories right under the root whose contents are the running kernel's and its services', and
// no part of the root file system that a boot assembles.
constexpr std::array<std::string_view, 4> kRunningSystem{"dev", "proc", "run", "sys"};

// True for the name of such a directory.
constexpr bool IsRunningSystem(std::string_view name) {
  return std::find(kRunningSystem.begin(), kRunningSystem.end(), name) != kRunningSystem.end();
}

}  // namespace LinuxHost
