#pragma once

#include <string>

namespace LinuxHost {

// What the library `name` of this installation shows as `symbol`. The library is loaded for good,
// unless it is there already. `purpose` says in messages what it is for: "unpacks tardisks". Throws
// Braxo::Lib::BraxoException when it is missing.
const void* FindInLateLibrary(const char* name, const char* symbol, const std::string& purpose);

}  // namespace LinuxHost
