#include "support/policy_tree.h"

#include <dirent.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <stdexcept>

namespace SecPolicyTest {

PolicyTree::PolicyTree(std::initializer_list<TreeEntry> entries) {
  for (const TreeEntry& entry : entries) Write(entry.path, entry.text);
}

void PolicyTree::Write(const std::string& path, const std::string& text) const {
  WriteTreeEntry(*this / path, text);
}

void WriteTreeEntry(const std::string& path, const std::string& text) {
  if (path.ends_with('/')) {
    std::filesystem::create_directories(path);
    return;
  }
  std::filesystem::create_directories(std::filesystem::path(path).parent_path());
  std::ofstream file(path, std::ios::binary);
  file << text << std::flush;
  if (!file) throw std::runtime_error("cannot write " + path);
}

std::vector<std::string> ListingOrder(const std::string& dir) {
  const std::unique_ptr<DIR, int (*)(DIR*)> directory(opendir(dir.c_str()), &closedir);
  if (!directory) throw std::runtime_error("cannot list " + dir);
  std::vector<std::string> names;
  while (const dirent* entry = readdir(directory.get())) {
    const std::string name = entry->d_name;
    if (name != "." && name != "..") names.push_back(name);
  }
  return names;
}

}  // namespace SecPolicyTest
