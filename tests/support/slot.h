#pragma once

#include <cstddef>
#include <cstring>

namespace SecPolicyTest {

// The number of a virtual operation in its table: a pointer to it holds one more than its distance
// from the table's start, in bytes.
template <class Operation>
std::ptrdiff_t Slot(Operation operation) {
  std::ptrdiff_t distance = 0;
  static_assert(sizeof operation >= sizeof distance);
  std::memcpy(&distance, &operation, sizeof distance);
  return (distance - 1) / static_cast<std::ptrdiff_t>(sizeof(void*));
}

}  // namespace SecPolicyTest
