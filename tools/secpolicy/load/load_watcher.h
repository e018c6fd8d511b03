#pragma once

#include <string>

#include "host/linux/operation/policy_load.h"
#include "secpolicy/observed/policy_observer.h"
#include "verb.h"

namespace SecPolicyCli {

// How a load ended.
struct LoadOutcome {
  ExitCode code = kFailed;
  std::string reason;               // why it did not end well
  LinuxHost::LoadEnding remainder;  // what no file has any more
};

// Is told each problem and each error of a load as it happens, and how it ended.
class LoadWatcher : public SecPolicy::PolicyObserver {
 public:
  // Nothing follows: the load may be about to end the process.
  virtual void OnOutcome(const LoadOutcome& /*outcome*/) {}
};

}  // namespace SecPolicyCli
