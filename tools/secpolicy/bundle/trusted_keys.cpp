#include "bundle/trusted_keys.h"

#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <map>

#include "host/linux/common/host_error.h"
#include "kitlibs/file.h"
#include "refusal.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {
namespace {

void RequireOwn(const std::string& path) {
  struct stat status {};
  if (stat(path.c_str(), &status) != 0) {
    constexpr char kCannotRead[] = "cannot read ";
    LinuxHost::ThrowErrno(kCannotRead, path);
  }
  const bool isOwn = status.st_uid == 0 || status.st_uid == geteuid();
  if (isOwn && (status.st_mode & (S_IWGRP | S_IWOTH)) == 0) return;
  throw Refusal("others may change " + path +
                ", so no key is taken from there. It has to belong to root, and 'chmod go-w' keeps "
                "others from it.");
}

// Who may change a directory above may put another in its place.
void RequireOwnWithAllAbove(const std::filesystem::path& directory) {
  RequireOwn(directory);
  if (directory.has_relative_path()) RequireOwnWithAllAbove(directory.parent_path());
}

std::vector<std::string> FindKeys() {
  std::vector<std::string> found;
  if (File_IsDirectory(kTrustedKeysDir)) {
    RequireOwnWithAllAbove(kTrustedKeysDir);
    std::map<std::string, std::string> files;
    SecPolicy::GetFileList(kTrustedKeysDir, files);
    for (const auto& [path, name] : files) {
      if (name.ends_with(".pem")) found.push_back(path);
    }
  }
  if (!found.empty()) return found;
  throw Refusal(std::string("there is no key to verify a bundle with. Put the public key of who "
                            "signs them into ") +
                kTrustedKeysDir + ", as NAME.pem, or name it: --key FILE.");
}

}  // namespace

std::vector<VerifyingKey> TrustedKeys(const std::vector<std::string>& files) {
  std::vector<VerifyingKey> keys;
  for (const std::string& file : files.empty() ? FindKeys() : files) {
    RequireOwn(file);
    keys.emplace_back(file);
  }
  return keys;
}

}  // namespace SecPolicyCli
