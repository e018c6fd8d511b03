#pragma once

#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// Runs `step`. A BraxoException is reported by its message; anything else passes through. Returns
// whether the step succeeded.
template <class Step>
bool CarryOn(Step step) {
  try {
    step();
    return true;
  } catch (const Braxo::Lib::BraxoException& failure) {
    SecpolicyError(failure.what());
    return false;
  }
}

// Runs `step` on every one of `items` as CarryOn does, so that a bad one does not stop the others.
// Returns whether all succeeded.
template <class Items, class Step>
bool ForEachCarryOn(Items& items, Step step) {
  bool allSucceeded = true;
  for (auto& item : items) {
    if (!CarryOn([&] { step(item); })) allSucceeded = false;
  }
  return allSucceeded;
}

}  // namespace SecPolicy
