#pragma once

#include <string>
#include <vector>

#include "host/enforce/plan/plan.h"

namespace SecPolicyCli {

// Opens the launcher, which lies outside of any root: to be called before one is entered. Without
// it, StartConfined() throws.
void OpenLauncher();

// Becomes the program `command`, confined by `plan`. Returns only by throwing
// Braxo::Lib::BraxoException.
[[noreturn]] void StartConfined(const Enforce::Plan& plan, const std::vector<std::string>& command);

}  // namespace SecPolicyCli
