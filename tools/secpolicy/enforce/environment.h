#pragma once

#include <string>
#include <vector>

#include "enforce/entry.h"

namespace SecPolicyCli {

// The variables of the program of the entry: those of this process, but for that of its own broker,
// with the entry's in place of those that have the same names.
std::vector<std::string> EnvironmentOf(const Entry& entry);

// As execve(2) takes words. They are the caller's, and may not be changed meanwhile.
std::vector<char*> PointersTo(std::vector<std::string>& words);

}  // namespace SecPolicyCli
