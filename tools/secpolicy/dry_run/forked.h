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

// Ends a process that was forked with the code that `body` returns. What the host keeps open for it
// is closed; what the parent would do at its own end, the functions of atexit() for one, is not
// done.
[[noreturn]] void RunAndExit(const std::function<ExitCode()>& body) noexcept;

}  // namespace SecPolicyCli
