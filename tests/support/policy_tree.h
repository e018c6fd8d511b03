#pragma once

#include <initializer_list>
#include <string>
#include <vector>

#include "support/temporary_directory.h"

namespace SecPolicyTest {

// A path with the file's text; a path that ends in "/" is a directory.
struct TreeEntry {
  std::string path;
  std::string text;
};

// A temporary directory with files, removed at the end.
//
//   PolicyTree tree({{"objects/base", "toolLabel\n"}, {"fileLabels/", ""}});
//   SecPolicy::LoadPolicyObjects(tree / "objects", access);
class PolicyTree {
 public:
  PolicyTree(std::initializer_list<TreeEntry> entries = {});

  // Adds a file or directory, and the directories above it.
  void Write(const std::string& path, const std::string& text) const;

  const std::string& Root() const { return root.Path(); }
  std::string operator/(const std::string& path) const { return root / path; }

 private:
  TemporaryDirectory root;
};

// Writes a file, or a directory when `path` ends in "/", with the directories above it.
void WriteTreeEntry(const std::string& path, const std::string& text);

// The names in `dir` in the order in which the system lists them, without "." and "..".
std::vector<std::string> ListingOrder(const std::string& dir);

}  // namespace SecPolicyTest
