#pragma once

#include <string>

#include "braxo/misc/strcat.h"

// How a state is known to be the one that the module keeps in the kernel.
namespace LinuxHost {

// The file that is there while it is, from the module's start to its stop.
inline std::string ModuleMarkOf(const std::string& state) {
  return Braxo::Misc::StrCat(state.substr(0, state.rfind('/')), "/module");
}

// The file with the generation that the module was told of the state as it is: gone from before any
// commit to the state on, until the module is told of that.
inline std::string PublishedMarkOf(const std::string& state) {
  return Braxo::Misc::StrCat(ModuleMarkOf(state), ".published");
}

}  // namespace LinuxHost
