#pragma once

#include <string>

namespace SecPolicyCli {

// Ends a verb, or a part of it, with a line "secpolicy: VERB: TEXT" on standard error, after what
// went to standard output.
void Summarize(const std::string& verb, const std::string& text);

}  // namespace SecPolicyCli
