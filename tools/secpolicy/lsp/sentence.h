#pragma once

#include <string>
#include <vector>

#include "words.h"

namespace SecPolicyCli {

// What a line says, in a sentence of Markdown; empty for one that is no whole rule. `domain` is the
// name of the domain whose file it is in.
std::string ExplainLine(FileRole role, const std::string& domain,
                        const std::vector<PlacedWord>& words);

}  // namespace SecPolicyCli
