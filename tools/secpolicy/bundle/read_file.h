#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <string>

namespace SecPolicyCli {

struct FileContent {
  std::string bytes;
  struct stat status {};
};

// Reads a regular file. Throws Refusal for anything else and for one of more than `most` bytes, and
// BraxoException when it cannot be read.
FileContent ReadFile(const std::string& path, std::size_t most);

}  // namespace SecPolicyCli
