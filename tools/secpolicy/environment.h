#pragma once

#include <set>
#include <string>
#include <vector>

namespace SecPolicyCli {

// The variables of this process, with `variables` in place of those that have the same names, and
// without those that are named in `dropped`.
std::vector<std::string> EnvironmentWith(std::vector<std::string> variables,
                                         std::set<std::string> dropped = {});

// As execve(2) takes words. They are the caller's, and may not be changed meanwhile.
std::vector<char*> PointersTo(std::vector<std::string>& words);

}  // namespace SecPolicyCli
