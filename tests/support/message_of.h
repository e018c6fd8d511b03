#pragma once

#include <string>

#include "braxo/lib/exception.h"

namespace SecPolicyTest {

// The message of the BraxoException that `call` throws, empty when it throws none. Any other
// exception passes.
template <class Call>
std::string MessageOf(Call call) {
  try {
    call();
  } catch (const Braxo::Lib::BraxoException& exception) {
    return exception.what();
  }
  return {};
}

}  // namespace SecPolicyTest
