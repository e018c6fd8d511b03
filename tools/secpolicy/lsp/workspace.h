#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "live_policy.h"
#include "text_document.h"

namespace SecPolicyCli {

// A file that is open in the editor.
struct OpenDocument {
  std::string uri;  // as the editor writes it
  std::optional<std::int64_t> version;
  TextDocument text;
};

// What the editor can do.
struct EditorAbilities {
  bool takesVersions = false;
  bool renamesFiles = false;
  bool watchesFiles = false;
};

// The files that are open, and the policy that they belong to. Paths are below the root that was
// entered.
class Workspace {
 public:
  Workspace(bool isFresh, std::vector<std::string> unwantedCodes)
      : fresh(isFresh), unwanted(std::move(unwantedCodes)) {}

  // The path of the file; nothing for one that is not below the root.
  static std::optional<std::string> PathOf(const std::string& uri);
  // The URI of a file, for one that is open as the editor writes it.
  std::string UriOf(const std::string& path) const;

  void Open(const std::string& path, OpenDocument document);
  void Close(const std::string& path);
  // Null when the file is not open. Changed() has to follow a change.
  OpenDocument* Find(const std::string& path);
  const OpenDocument* Find(const std::string& path) const;
  void Changed(const std::string& path);

  // What other programs do may have changed everything.
  void Forget();

  // The text of a file, as it is open or on disk; empty when it cannot be read.
  TextDocument TextOf(const std::string& path) const;

  // The policy that the file belongs to, checked; null when it belongs to none. Only one policy is
  // known at a time. Throws what the host throws.
  LivePolicy* PolicyOf(const std::string& path);

  // What the lines of the file are; nothing for a file that a load does not read.
  std::optional<FileRole> RoleOf(const std::string& path) const;

  // The name of the domain that the file defines.
  static std::string DomainOf(const std::string& path);

  // The policy that the open files belong to; null before one does.
  LivePolicy* Policy() { return policy.get(); }

  EditorAbilities editor;

 private:
  void Use(const std::string& root);

  bool fresh;
  std::vector<std::string> unwanted;
  std::map<std::string, OpenDocument> documents;  // by path
  std::unique_ptr<LivePolicy> policy;
};

}  // namespace SecPolicyCli
