#pragma once

#include <sys/types.h>

#include <functional>

namespace Enforce {

// Has a child process use a capability, after `place` was called with its number. True when it was
// refused. Throws Braxo::Lib::BraxoException when there can be no such process, and what `place`
// throws.
bool IsRefused(const std::function<void(pid_t)>& place);

}  // namespace Enforce
