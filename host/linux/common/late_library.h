#pragma once

#include <string>

namespace LinuxHost {

// What to do about a library that is a part of every installation.
inline constexpr char kInstallAgain[] =
    "It is installed with this command: install secpolicy again";

// What the library `name` of this installation shows as `symbol`. The library is loaded for good,
// unless it is there already. `purpose` says in messages what it is for: "unpacks tardisks"; and
// `remedy` what to do where it is missing. Throws Braxo::Lib::BraxoException when it is.
const void* FindInLateLibrary(const char* name, const char* symbol, const std::string& purpose,
                              const std::string& remedy = kInstallAgain);

}  // namespace LinuxHost
