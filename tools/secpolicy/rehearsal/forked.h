#pragma once

#include <array>
#include <csignal>
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
// none may be open. Throws std::system_error when no child can be made.
ForkedEnd RunForked(const std::function<ExitCode()>& body);

// As long as it lives, what asks this process to end, ends only the child that it runs, so that
// there is somebody to clear up after the child. Only one at a time.
class InterruptibleChild {
 public:
  InterruptibleChild();
  InterruptibleChild(const InterruptibleChild&) = delete;
  InterruptibleChild& operator=(const InterruptibleChild&) = delete;
  ~InterruptibleChild();

  // RunForked with such a child. The signals that came since the construction reach it too.
  ForkedEnd Run(const std::function<ExitCode()>& body);

 private:
  // The last one says that nobody reads the messages any more.
  static constexpr std::array kSignals = {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGPIPE};

  void Restore();

  std::array<struct sigaction, kSignals.size()> actionsBefore{};
  sigset_t maskBefore{};
};

}  // namespace SecPolicyCli
