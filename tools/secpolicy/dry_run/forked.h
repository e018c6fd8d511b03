#pragma once

#include <functional>
#include <string>

#include "verb.h"

namespace SecPolicyCli {

// How a child process ended.
struct ForkedEnd {
  ExitCode code = kFailed;
  std::string death;  // what ended it, when it did not end by itself: "Segmentation fault"
};

// Runs `body` in a child process, which ends with the code that it returns, and waits for it. What
// the library ends, ends only the child. Connections to the host's state do not outlive a fork, so
// none may be open. Throws Braxo::Lib::BraxoException when no child can be made.
ForkedEnd RunForked(const std::function<ExitCode()>& body);

}  // namespace SecPolicyCli
