#pragma once

#include <string>
#include <vector>

#include "enforce/entry.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// The domain that this process enters by executing `command`, whose first word is a path or a name
// that is looked for in PATH, and the very program that this was judged by; of a script its real
// path. Throws Braxo::Lib::BraxoException when there is no such program, and when its own domain may
// not execute it.
Entry EntryByExec(std::vector<std::string> command, SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
