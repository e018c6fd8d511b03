#include "edit.h"

#include "protocol.h"

namespace SecPolicyCli {

void WorkspaceEdit::Replace(const std::string& path, Range range, const std::string& text) {
  const auto [list, isNew] = edits.try_emplace(path, Json::Array());
  list->second.Append(TextEdit(range, text));
}

void WorkspaceEdit::RenameFile(const std::string& from, const std::string& to) {
  renames.push_back(
      {{"kind", "rename"}, {"oldUri", workspace.UriOf(from)}, {"newUri", workspace.UriOf(to)}});
}

Json WorkspaceEdit::ToJson() const {
  Json changes = Json::Object();
  Json documentChanges = Json::Array();
  for (const auto& [path, list] : edits) {
    const std::string uri = workspace.UriOf(path);
    const OpenDocument* const document = workspace.Find(path);
    const bool isVersioned = document != nullptr && document->version;
    const Json version = isVersioned ? Json(*document->version) : Json();
    changes[uri] = list;
    documentChanges.Append(
        {{"textDocument", {{"uri", uri}, {"version", version}}}, {"edits", list}});
  }
  for (const Json& rename : renames) documentChanges.Append(rename);
  if (!workspace.editor.takesVersions) return {{"changes", changes}};
  return {{"documentChanges", documentChanges}};
}

}  // namespace SecPolicyCli
