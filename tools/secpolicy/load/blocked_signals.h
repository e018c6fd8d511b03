#pragma once

#include <signal.h>

#include <initializer_list>

namespace SecPolicyCli {

// As long as it lives, what asks the process to end waits, and so does that nobody reads the
// messages: for what is to be done whole or undone.
class BlockedSignals {
 public:
  BlockedSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGPIPE})
      sigaddset(&signals, signal);
    sigprocmask(SIG_BLOCK, &signals, &before);
  }
  BlockedSignals(const BlockedSignals&) = delete;
  BlockedSignals& operator=(const BlockedSignals&) = delete;
  ~BlockedSignals() { sigprocmask(SIG_SETMASK, &before, nullptr); }

 private:
  sigset_t before;
};

}  // namespace SecPolicyCli
