#pragma once

#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "bundle/archive.h"

namespace SecPolicyCli {

// The paths of the files of the policy directory `dir` that a boot or a load reads, by their names
// below it, in byte order. Throws BraxoException.
std::map<std::string, std::string> ListPolicyTree(const std::string& dir);

// The same with their content. Throws Refusal for a name that a bundle cannot have, and
// BraxoException.
std::vector<ArchiveEntry> ReadPolicyTree(const std::string& dir);

// True for the name, below a policy directory, of a file that a boot or a load reads and that a
// bundle can have.
bool IsPolicyFile(std::string_view name);

}  // namespace SecPolicyCli
