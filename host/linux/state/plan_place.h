#pragma once

#include <string>

#include "braxo/misc/strcat.h"

// Where plans made from a state lie, so that those enter domains who may not read the state.
namespace LinuxHost {

// The directory of the plans.
inline std::string PlansOf(const std::string& state) {
  return Braxo::Misc::StrCat(state.substr(0, state.rfind('/')), "/plans");
}

// The file that says which of them are of the state as it is: gone from before any commit to the
// state on, until new ones are made. The names of plans begin with no dot.
inline std::string CurrentPlansOf(const std::string& state) {
  return Braxo::Misc::StrCat(PlansOf(state), "/.current");
}

}  // namespace LinuxHost
