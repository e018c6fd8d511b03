#pragma once

#include <string>

namespace LinuxHost {

// Where the settings in use do not know the numbers that the state has given to labels, as when
// they were lost, they take them over. Returns what to tell of it; empty when nothing was done.
// Throws Braxo::Lib::BraxoException when the state or the settings cannot be used.
std::string TakeOverLabelNumbers();

}  // namespace LinuxHost
