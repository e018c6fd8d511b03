#pragma once

#include <cstdint>

namespace TeskCtl::Security {

/// The values that a parameter check grants or revokes, both ends included; equal for one value.
struct TeskAccess_ModeParam {
  std::uint64_t first;   ///< the least value
  std::uint64_t second;  ///< the greatest value
};

}  // namespace TeskCtl::Security
