#pragma once

#include <memory>
#include <string>

#include "verb.h"

namespace SecPolicyCli {

// Adds the required argument NAME, the name of a saved state, to `syntax`.
std::shared_ptr<const std::string> AddSavedName(Syntax& syntax, const std::string& meaning);

// Does what `action` does, and ends `verb` with the message of what it throws.
ExitCode RunOrRefuse(const std::string& verb, const Action& action);

}  // namespace SecPolicyCli
