#pragma once

#include "host/linux/state/state_base.h"

namespace LinuxHost {

// Installs something that refers to domains and labels. `refuse()` returns why it cannot be
// installed as far as is known (an optional HostError); `install()` does it in one statement that
// changes nothing, and returns false, once what is known no longer holds. Throws the refusal, and a
// HostError for a state that contradicts itself.
template <class Refuse, class Install>
void InstallChecked(StateBase& base, const Refuse& refuse, const Install& install) {
  // The common way makes one statement: what was known last is good enough to check against, since
  // the installation itself proves that it still holds.
  if (!refuse() && install()) return;
  // What is known is anew with each turn, so that only a state that contradicts itself needs many.
  constexpr int kTurns = 1000;
  for (int turn = 0; turn < kTurns; ++turn) {
    base.Refresh();
    if (const auto refusal = refuse()) throw *refusal;
    if (install()) return;
  }
  base.Database().TellDamage("its tables contradict each other");
}

}  // namespace LinuxHost
