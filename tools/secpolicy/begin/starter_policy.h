#pragma once

#include <span>
#include <string>

namespace SecPolicyCli {

// A file of the policy that a new host begins with.
struct StarterFile {
  const char* path;  // below the policy directory
  const char* text;
};

// All of them, the smallest policy that a boot installs without an error.
std::span<const StarterFile> StarterFiles();

// The file of a new domain.
std::string StarterDomain(const std::string& name);

}  // namespace SecPolicyCli
