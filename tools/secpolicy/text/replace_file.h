#pragma once

#include <string>

namespace SecPolicyCli {

// Puts a file with this text in place of `path`, which everybody may read and others see whole: the
// old or the new. What is there and is no file, such as a device or a pipe, stays, and the text is
// written into it; so it is where `path` names standard output. Throws BraxoException.
void ReplaceFile(const std::string& path, const std::string& text);

}  // namespace SecPolicyCli
