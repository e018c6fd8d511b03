#pragma once

#include <linux/seccomp.h>

#include <string_view>
#include <vector>

#include "host/enforce/supervise/caller.h"
#include "policy/decision.h"

namespace Enforce {

// True when system calls of this name are about more than their own number: files, arguments that
// are checked, capabilities.
bool AsksMore(std::string_view call);

// What a call asks the rules of a domain beside its number: files and sockets by their paths, which
// have no labels here, the arguments that are checked, and the capabilities that it takes when the
// caller is root. A file that is not there and is not made is nobody's business.
std::vector<Policy::Question> AskedBy(const seccomp_data& call, const Caller& caller);

}  // namespace Enforce
