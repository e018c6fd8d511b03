#pragma once

#include <string>
#include <vector>

#include "host/enforce/plan/plan.h"
#include "host/linux/common/descriptor.h"

namespace SecPolicyCli {

// Opens the launcher, which lies outside of any root: to be called before one is entered. Without
// it, StartConfined() throws.
void OpenLauncher();

// Becomes the program `command`, confined by `plan`; where `program` is open, what that stands for,
// by the name that the command begins with. Returns only by throwing Braxo::Lib::BraxoException.
[[noreturn]] void StartConfined(const Enforce::Plan& plan, const std::vector<std::string>& command,
                                const LinuxHost::Descriptor& program);

}  // namespace SecPolicyCli
