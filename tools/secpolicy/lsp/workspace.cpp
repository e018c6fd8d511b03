#include "workspace.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <system_error>
#include <utility>

#include "check/policy_files.h"
#include "root.h"
#include "secpolicy/policy_root.h"
#include "text/uri.h"

namespace SecPolicyCli {
namespace {

bool IsBelow(const std::string& path, const std::string& dir) {
  return path.starts_with(dir) && (dir.ends_with('/') || path.substr(dir.size(), 1) == "/");
}

}  // namespace

std::optional<std::string> Workspace::PathOf(const std::string& uri) {
  const auto given = PathOfUri(uri);
  if (!given) return std::nullopt;
  const std::string path = std::filesystem::path(*given).lexically_normal();
  if (PlacesOfRoot().empty()) return path;
  for (const std::string& root : PlacesOfRoot()) {
    if (!IsBelow(path, root)) continue;
    return path.substr(root.ends_with('/') ? root.size() - 1 : root.size());
  }
  return std::nullopt;
}

std::string Workspace::UriOf(const std::string& path) const {
  if (const OpenDocument* const document = Find(path)) return document->uri;
  if (PlacesOfRoot().empty()) return ToUri(path);
  const std::string& root = PlacesOfRoot().front();
  return ToUri(root + path.substr(root.ends_with('/') ? 1 : 0));
}

void Workspace::Open(const std::string& path, OpenDocument document) {
  documents.insert_or_assign(path, std::move(document));
  Changed(path);
}

void Workspace::Close(const std::string& path) {
  documents.erase(path);
  if (policy) policy->Release(path);
}

OpenDocument* Workspace::Find(const std::string& path) {
  const auto found = documents.find(path);
  return found == documents.end() ? nullptr : &found->second;
}

const OpenDocument* Workspace::Find(const std::string& path) const {
  const auto found = documents.find(path);
  return found == documents.end() ? nullptr : &found->second;
}

void Workspace::Changed(const std::string& path) {
  const auto root = FindPolicyOf(path);
  if (!root) return;
  Use(*root);
  policy->Take(path, documents.at(path).text.Text());
}

void Workspace::Forget() {
  if (policy) policy->Forget();
}

TextDocument Workspace::TextOf(const std::string& path) const {
  if (const OpenDocument* const document = Find(path)) return document->text;
  // Some problems are those of directories.
  std::error_code ignored;
  if (!std::filesystem::is_regular_file(path, ignored)) return TextDocument("");
  std::ifstream file(path, std::ios::binary);
  return TextDocument(std::string(std::istreambuf_iterator<char>(file), {}));
}

// The tables of the host can be taken for one policy at a time.
void Workspace::Use(const std::string& root) {
  if (policy && policy->Root() == root) return;
  policy.reset();
  policy = std::make_unique<LivePolicy>(root, fresh, unwanted);
  for (const auto& [path, document] : documents) {
    if (FindPolicyOf(path) == root) policy->Take(path, document.text.Text());
  }
}

LivePolicy* Workspace::PolicyOf(const std::string& path) {
  const auto root = FindPolicyOf(path);
  if (!root) return nullptr;
  Use(*root);
  policy->Check();
  return policy.get();
}

std::optional<FileRole> Workspace::RoleOf(const std::string& path) const {
  const auto root = FindPolicyOf(path);
  if (!root) return std::nullopt;
  const std::filesystem::path dir = std::filesystem::path(path).parent_path();
  if (dir == *root / SecPolicy::kObjectsDir) return FileRole::kObjectFile;
  if (dir == *root / SecPolicy::kTardisksDir) return FileRole::kTardiskFile;
  if (dir == *root / SecPolicy::kFileLabelsDir) return FileRole::kLabelFile;
  const auto dirs = DomainsDirsOf(*root);
  const bool isDomain = std::ranges::find(dirs, dir.string(), &DomainsDir::path) != dirs.end();
  return isDomain ? std::optional(FileRole::kDomainFile) : std::nullopt;
}

std::string Workspace::DomainOf(const std::string& path) {
  const std::filesystem::path file(path);
  const bool isPartner = file.parent_path().filename() == SecPolicy::kPartnersDir;
  return (isPartner ? SecPolicy::kPartnerPrefix : "") + file.filename().string();
}

}  // namespace SecPolicyCli
