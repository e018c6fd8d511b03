#pragma once

#include <memory>
#include <optional>
#include <string>

#include "command_line.h"

namespace SecPolicyCli {

// Adds the argument DIR, a policy directory, to `syntax`; its value is `preset` when it is not
// given.
std::shared_ptr<const std::string> AddPolicyDir(Syntax& syntax, const std::string& preset);

// Adds the flag --timing to `syntax`.
Option AddTiming(Syntax& syntax, bool& timing);

// Refuses a policy directory that is not there; nothing for one that is.
std::optional<ExitCode> RefuseMissingDir(const std::string& verb, const std::string& dir);

// Loads the policy directory `dir` with `load` for the verb `verb`. A directory that is not there
// is refused before anything is changed. `timing` shows the time by phase.
ExitCode LoadFrom(const std::string& verb, const std::string& dir,
                  void (*load)(const std::string& dir), bool timing = false);

}  // namespace SecPolicyCli
