#pragma once

#include <functional>
#include <optional>
#include <string>

#include "reply.h"

namespace SecPolicyPython {

// Runs `work` in a child process with the root directory `root`, or the caller's own without one,
// and returns what it has sent. The root, the connections to a host's state, and the end that a
// load without a needed domain comes to are the child's alone, so any number of threads may do
// this. `checkSignals` is called now and then; when it throws, the child is asked to end, and the
// exception passes on when it has. Throws Braxo::Lib::BraxoException when there can be no child,
// and when it ends without a reply.
Reply RunBelow(const std::optional<std::string>& root, const std::function<void(const Send&)>& work,
               const std::function<void()>& checkSignals);

}  // namespace SecPolicyPython
