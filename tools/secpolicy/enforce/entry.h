#pragma once

#include <functional>
#include <string>
#include <vector>

#include "command_line.h"
#include "secpolicy/secpolicy.h"
#include "verb.h"

namespace SecPolicyCli {

struct EntryOptions {
  bool bestEffort = false;
};

// Adds --best-effort to `syntax`.
void AddEntryOptions(Syntax& syntax, EntryOptions& options);

// Becomes the program `command` in the domain that `findDomain` names. Returns only where it was
// not started, with what to end with; why has been told then.
ExitCode EnterDomain(
    const std::string& verb,
    const std::function<std::string(SecPolicy::TeskAccessInterfaceImpl&)>& findDomain,
    const std::vector<std::string>& command, const EntryOptions& options);

}  // namespace SecPolicyCli
