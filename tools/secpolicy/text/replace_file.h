#pragma once

#include <string>

namespace SecPolicyCli {

// Puts a file with this text in place of `path`, which everybody may read and others see whole: the
// old or the new. Throws BraxoException.
void ReplaceFile(const std::string& path, const std::string& text);

}  // namespace SecPolicyCli
