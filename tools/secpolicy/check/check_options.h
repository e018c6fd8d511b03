#pragma once

#include <string>
#include <vector>

#include "command_line.h"

namespace SecPolicyCli {

// Adds the options of a check to `syntax`: --fresh, and --disable for warnings that are not wanted.
void AddFresh(Syntax& syntax, bool& fresh);
void AddUnwantedCodes(Syntax& syntax, std::vector<std::string>& codes);

}  // namespace SecPolicyCli
