#include "bundle/policy_tree.h"

#include <algorithm>

#include "bundle/bundle_limits.h"
#include "bundle/read_file.h"
#include "kitlibs/file.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {
namespace {

const std::vector<std::string>& Directories() {
  using namespace SecPolicy;
  static const std::vector<std::string> directories = {
      kObjectsDir,  kDomainsDir,    std::string(kDomainsDir) + "/" + kPartnersDir,
      kTardisksDir, kFileLabelsDir, std::string(kEarlyDir) + "/" + kDomainsDir};
  return directories;
}

bool IsPlain(char byte) { return byte > ' ' && byte <= '~' && byte != '/' && byte != '\\'; }

}  // namespace

std::map<std::string, std::string> ListPolicyTree(const std::string& dir) {
  std::map<std::string, std::string> paths;
  for (const std::string& directory : Directories()) {
    const std::string place = dir + "/" + directory;
    if (!File_IsDirectory(place.c_str())) continue;
    std::map<std::string, std::string> files;
    SecPolicy::GetFileList(place, files);
    for (const auto& [path, name] : files) paths.emplace(directory + "/" + name, path);
  }
  return paths;
}

std::vector<ArchiveEntry> ReadPolicyTree(const std::string& dir) {
  std::vector<ArchiveEntry> entries;
  for (const auto& [name, path] : ListPolicyTree(dir)) {
    if (!IsPolicyFile(name)) {
      throw Refusal("a bundle cannot hold " + path +
                    ": the name of a file takes visible ASCII but no backslash, begins with no "
                    "dot, and has at most " +
                    std::to_string(kLongestPolicyFile) +
                    " characters with its directory. Rename it or move it away.");
    }
    entries.push_back({name, ReadFile(path, kLargestBundle).bytes});
  }
  return entries;
}

bool IsPolicyFile(std::string_view name) {
  const std::size_t slash = name.rfind('/');
  if (slash == std::string_view::npos || name.size() > kLongestPolicyFile) return false;
  const std::string_view file = name.substr(slash + 1);
  return std::ranges::find(Directories(), name.substr(0, slash)) != Directories().end() &&
         !file.empty() && !file.starts_with('.') && std::ranges::all_of(file, IsPlain);
}

}  // namespace SecPolicyCli
