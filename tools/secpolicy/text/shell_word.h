#pragma once

#include <string>

namespace SecPolicyCli {

// The word as it is typed in a shell, in double quotes where it needs some: commands that are told
// stand in single ones.
std::string ShellWord(const std::string& word);

}  // namespace SecPolicyCli
