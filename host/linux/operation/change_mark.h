#pragma once

#include <memory>

#include "host/linux/state/store.h"

namespace LinuxHost {

class HostState;

// A moment in the life of a state, for whoever acts on the policy and must notice when it changes.
// Of this process alone; keeps a connection to the state open.
struct ChangeMark {
  std::shared_ptr<HostState> state;
  Store::CommitMark committed{};
  bool isKnown = false;  // false: others were committing just then
};

// The moment now, of the state in use. Throws HostError when that cannot be used. What is read
// afterwards is at least as new.
ChangeMark TakeChangeMark();

// True when anything was committed since `mark` was taken, by whomever: rules, domains, labels,
// levels, but also what is no policy, such as the record of a load. True, too, when another file is
// in the place of the state, or this process was forked. Costs one system call, and no look at the
// database.
bool ChangedSince(const ChangeMark& mark);

}  // namespace LinuxHost
