#include "policy_files.h"

#include <map>

#include "host/linux/operation/policy_load.h"
#include "kitlibs/file.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {
namespace {

bool IsDirectory(const std::string& path) { return File_IsDirectory(path.c_str()); }

bool HoldsDomains(const std::filesystem::path& dir) {
  return IsDirectory(dir / SecPolicy::kDomainsDir);
}

void AddNames(const std::string& dir, const std::string& prefix, std::vector<std::string>& names) {
  if (!IsDirectory(dir)) return;
  std::map<std::string, std::string> files;
  SecPolicy::GetFileList(dir, files);
  for (const auto& [path, name] : files) names.push_back(prefix + name);
}

}  // namespace

std::vector<DomainsDir> DomainsDirsOf(const std::string& root) {
  const std::string domains = root + "/" + SecPolicy::kDomainsDir;
  const std::string early = root + "/" + SecPolicy::kEarlyDir + "/" + SecPolicy::kDomainsDir;
  const std::string partners = domains + "/" + SecPolicy::kPartnersDir;
  std::vector<DomainsDir> dirs;
  if (IsDirectory(early)) dirs.push_back({early, "", ""});
  dirs.push_back({domains, "", SecPolicy::kPartnersDir});
  if (IsDirectory(partners)) dirs.push_back({partners, SecPolicy::kPartnerPrefix, ""});
  return dirs;
}

std::optional<std::filesystem::path> FindPolicyOf(const std::filesystem::path& file) {
  std::filesystem::path dir = file.parent_path();
  while (!HoldsDomains(dir)) {
    if (!dir.has_relative_path()) return std::nullopt;
    dir = dir.parent_path();
  }
  if (dir.filename() == SecPolicy::kEarlyDir && HoldsDomains(dir.parent_path())) {
    dir = dir.parent_path();
  }
  return dir;
}

void BeginLoadOf(LinuxHost::PolicyTransaction& load, const std::string& root) {
  const std::string domains = root + "/" + SecPolicy::kDomainsDir;
  std::vector<std::string> names;
  AddNames(domains, "", names);
  AddNames(domains + "/" + SecPolicy::kPartnersDir, SecPolicy::kPartnerPrefix, names);
  load.BeginLoad({.kind = LinuxHost::LoadKind::kFull, .directory = root, .domains = names});
}

}  // namespace SecPolicyCli
