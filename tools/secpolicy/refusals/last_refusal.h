#pragma once

#include <string>

#include "verb.h"

namespace SecPolicyCli {

// Explains on standard output, as `why` does, what was refused last in the domain with this name or
// number, or in any where that is empty: in `format`, which is "text" or "json". Throws what `why`
// does, and a Refusal where no refusal is known.
ExitCode ExplainLastRefusal(const std::string& domain, const std::string& format);

}  // namespace SecPolicyCli
