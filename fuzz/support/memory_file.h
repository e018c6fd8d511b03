#pragma once

#include <string>
#include <string_view>

namespace SecPolicyFuzz {

// A file in memory that has a path.
class MemoryFile {
 public:
  MemoryFile();
  MemoryFile(const MemoryFile&) = delete;
  MemoryFile& operator=(const MemoryFile&) = delete;
  ~MemoryFile();

  // Makes `text` the whole contents.
  void Write(std::string_view text) const;

  const std::string& Path() const { return path; }

 private:
  int descriptor;
  std::string path;
};

}  // namespace SecPolicyFuzz
