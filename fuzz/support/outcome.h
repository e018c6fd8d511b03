#pragma once

#include <string>

#include "braxo/lib/exception.h"

namespace SecPolicyFuzz {

// The message of the BraxoException that `function` throws, empty when it returns. Every other
// exception is a finding and passes.
template <class Function>
std::string FailureOf(Function function) {
  try {
    function();
  } catch (const Braxo::Lib::BraxoException& failure) {
    return failure.what();
  }
  return {};
}

}  // namespace SecPolicyFuzz
