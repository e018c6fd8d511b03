#pragma once

#include "braxo/lib/exception.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// Returns what `attempt` returns; where that asks for another try, it gets a few of them. Throws
// Braxo::Lib::BraxoException, with what to do, when none is left.
template <class Attempt>
auto Retry(Attempt attempt) {
  constexpr int kMostTries = 5;
  for (int tries = 1;; ++tries) {
    try {
      return attempt();
    } catch (const SecPolicy::SecPolicyRetryException& again) {
      if (tries < kMostTries) continue;
      throw Braxo::Lib::BraxoException(
          std::string(again.what()) +
          ". Others changed it at each of 5 tries: run it again when they are done");
    }
  }
}

}  // namespace SecPolicyCli
