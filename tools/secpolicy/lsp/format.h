#pragma once

#include <string>
#include <vector>

#include "text_document.h"
#include "words.h"

namespace SecPolicyCli {

// The lines of a policy file with their columns aligned: neighbouring rules of a kind by their
// words, and the comments behind them. There are as many lines as before, with the same words and
// comments. From a line on that is longer than the library reads, everything stays as it is.
std::vector<std::string> FormatLines(FileRole role, const TextDocument& text);

}  // namespace SecPolicyCli
