#pragma once

#include <string>
#include <vector>

namespace SecPolicyCli {

// The one of `candidates` that `word` is most likely a misspelling of; empty when none is near.
std::string NearestWord(const std::string& word, const std::vector<std::string>& candidates);

}  // namespace SecPolicyCli
