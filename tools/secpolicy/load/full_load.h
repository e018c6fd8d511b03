#pragma once

#include <string>
#include <vector>

#include "load/load_run.h"

namespace SecPolicyCli {

// The load of the full policy in `dir`.
LoadRequest FullLoad(const std::string& dir);

// The steps of a load of the policy in `dir` that is to be the host's own, partner domains
// included.
std::vector<LoadStep> OwnLoad(const std::string& dir);

}  // namespace SecPolicyCli
