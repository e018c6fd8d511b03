#pragma once

#include <cstdint>

namespace LinuxHost {

class HostState;

// How much policy is installed. Rules are counted as a display shows them, one a line.
struct PolicyCount {
  std::uint64_t domains = 0;
  std::uint64_t rules = 0;
  std::uint64_t objects = 0;
};

// Throws Braxo::Lib::BraxoException when the state cannot be used.
PolicyCount CountPolicy(HostState& state);

}  // namespace LinuxHost
