#pragma once

#include <string>

#include "host/enforce/module/map_entries.h"

namespace Enforce {

// The hash of an absolute path without "." and "..", as the kernel's programs make it.
__u64 HashOf(const std::string& path, const ModuleHashing& how);

}  // namespace Enforce
