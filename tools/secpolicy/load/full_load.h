#pragma once

#include <string>

#include "load/load_run.h"

namespace SecPolicyCli {

// The load of the full policy in `dir`.
LoadRequest FullLoad(const std::string& dir);

}  // namespace SecPolicyCli
