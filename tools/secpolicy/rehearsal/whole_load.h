#pragma once

#include <string>

#include "verb.h"

namespace SecPolicyCli {

// Loads `policyDir` when a rehearsal of the load ends well, and changes nothing otherwise. When the
// load then fails all the same, is interrupted or dies, the state and the labels of the files are
// put back as they were just before it; what others have changed while it ran is lost. Returns how
// the load, or its rehearsal, ended.
ExitCode LoadAllOrNothing(const std::string& policyDir);

}  // namespace SecPolicyCli
