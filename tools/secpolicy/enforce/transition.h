#pragma once

#include <string>

#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// The name of the domain that this process enters by executing `program`, a path or a name that is
// looked for in PATH. Throws Braxo::Lib::BraxoException when its own domain may not execute it.
std::string DomainByExec(const std::string& program, SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
