#pragma once

#include <map>
#include <string>
#include <vector>

#include "json.h"
#include "workspace.h"

namespace SecPolicyCli {

// Changes of several files, for the editor to make.
class WorkspaceEdit {
 public:
  explicit WorkspaceEdit(const Workspace& files) : workspace(files) {}

  void Replace(const std::string& path, Range range, const std::string& text);

  // After all replacements. Only for editors that rename files.
  void RenameFile(const std::string& from, const std::string& to);

  // As the editor takes it: with the versions of the files, where it knows them.
  Json ToJson() const;

 private:
  const Workspace& workspace;
  std::map<std::string, Json> edits;  // by path
  std::vector<Json> renames;
};

}  // namespace SecPolicyCli
