#pragma once

#include <cstdint>
#include <string>

namespace Enforce {

enum class MaskKind : std::uint8_t {
  kHidden,  // an empty place that nothing can be done with
  kNoExec,  // what is there cannot be executed, neither as a program nor as a library
};

// A path at which a domain may do less than a wider right says.
struct Mask {
  std::string path;
  MaskKind kind = MaskKind::kHidden;

  bool operator==(const Mask&) const = default;
};

}  // namespace Enforce
