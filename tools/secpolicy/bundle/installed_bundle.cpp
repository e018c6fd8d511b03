#include "bundle/installed_bundle.h"

#include <algorithm>
#include <filesystem>
#include <system_error>

#include "bundle/bundle_decision.h"
#include "bundle/bundle_limits.h"
#include "bundle/policy_tree.h"
#include "bundle/read_file.h"
#include "host/linux/operation/text_digest.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

// Those of tardisks, or all others.
std::vector<BundledFile> FilesIn(const std::string& dir, bool ofTardisks) {
  std::vector<BundledFile> files;
  for (const auto& [name, path] : ListPolicyTree(dir)) {
    if (IsTardiskPolicy(name) != ofTardisks) continue;
    files.push_back(DescribeFile({name, ReadFile(path, kLargestBundle).bytes}));
  }
  return files;
}

}  // namespace

std::optional<InstalledBundle> ReadInstalledBundle(const std::string& dir) {
  const std::string path = dir + "/" + kManifestName;
  std::error_code unknown;
  if (std::filesystem::symlink_status(path, unknown).type() ==
      std::filesystem::file_type::not_found) {
    return std::nullopt;
  }
  const FileContent file = ReadFile(path, kLargestBundle);
  try {
    return InstalledBundle{.manifest = ReadManifest(file.bytes),
                           .digest = LinuxHost::DigestOf(file.bytes),
                           .time = file.status.st_mtime};
  } catch (const BadManifest& bad) {
    throw Refusal(path + " does not tell which bundle is installed: " + bad.what() +
                  ". Without that file the policy is that of no bundle.");
  }
}

std::vector<std::string> FindEdits(const std::string& dir, const Manifest& manifest) {
  std::vector<BundledFile> named = manifest.files;
  std::erase_if(named, [](const BundledFile& file) { return IsTardiskPolicy(file.path); });
  return EditedFiles(named, FilesIn(dir, false));
}

bool IsTardiskPolicy(const std::string& name) {
  return name.starts_with(std::string(SecPolicy::kTardisksDir) + "/");
}

std::string FindForeignTardiskPolicy(const std::string& dir, const Manifest& manifest) {
  const std::vector<BundledFile> found = FilesIn(dir, true);
  for (const BundledFile& file : manifest.files) {
    if (IsTardiskPolicy(file.path) && std::ranges::find(found, file) == found.end()) {
      return file.path;
    }
  }
  return "";
}

}  // namespace SecPolicyCli
