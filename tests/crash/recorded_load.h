#pragma once

#include <string>
#include <vector>

#include "host_root.h"

namespace CrashTest {

// Loads the policy of `root` in a process of its own that nothing disturbs, into a new state.
// Returns the content of the state after each call of the library to the host that changed it, the
// first one being empty. Throws when the load fails.
std::vector<std::string> RecordLoad(const HostRoot& root);

}  // namespace CrashTest
