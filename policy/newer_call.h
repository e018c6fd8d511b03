#pragma once

#include <span>
#include <string_view>

// System calls that are newer than the library that knows the others may be. Numbers this high are
// the same on all architectures.
namespace Policy {

struct NewerCall {
  int number;
  std::string_view name;
};

// Every one, in ascending order of their numbers.
std::span<const NewerCall> NewerCalls();

}  // namespace Policy
