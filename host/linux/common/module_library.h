#pragma once

#include "host/enforce/module/entry_point.h"

namespace LinuxHost {

// The module's library, loaded now unless it is there already. Throws HostError with what to do
// where it is missing.
const Enforce::ModuleFunctions& ModuleLibrary();

}  // namespace LinuxHost
