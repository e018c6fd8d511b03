#include <algorithm>
#include <map>

#include "cursor.h"
#include "features.h"
#include "mentions.h"
#include "protocol.h"

namespace SecPolicyCli {
namespace {

using Policy::WordKind;

// Where words are, with each file read once.
class Locations {
 public:
  explicit Locations(const Workspace& files) : workspace(files) {}

  void Add(const Mention& mention) {
    const std::string& path = mention.file.source->Path();
    const auto [text, isNew] = texts.try_emplace(path, "");
    if (isNew) text->second = workspace.TextOf(path);
    const Span span = SpanInText(text->second, mention.line, mention.span);
    list.Append(LocationOf(workspace.UriOf(path), text->second.RangeOf(span)));
  }

  void AddFile(const std::string& path) { list.Append(LocationOf(workspace.UriOf(path), {})); }

  const Json& List() const { return list; }

 private:
  const Workspace& workspace;
  std::map<std::string, TextDocument> texts;
  Json list = Json::Array();
};

}  // namespace

Json FindDefinition(Workspace& workspace, const Json& params) {
  const auto cursor = FindCursor(workspace, params);
  const auto symbol =
      cursor && cursor->word != nullptr ? SymbolOf(cursor->policy, *cursor->word) : std::nullopt;
  if (!symbol) return {};
  Locations locations(workspace);
  if (symbol->kind == WordKind::kDomain) {
    for (const std::string& path : FilesOfDomain(cursor->policy, symbol->name)) {
      locations.AddFile(path);
    }
  }
  if (symbol->kind != WordKind::kLabel) return locations.List();
  for (const Mention& mention : FindMentions(cursor->policy, *symbol)) {
    if (mention.Declares()) locations.Add(mention);
  }
  return locations.List();
}

Json FindReferences(Workspace& workspace, const Json& params) {
  const auto cursor = FindCursor(workspace, params);
  const auto symbol =
      cursor && cursor->word != nullptr ? SymbolOf(cursor->policy, *cursor->word) : std::nullopt;
  if (!symbol) return {};
  const bool isDeclarationWanted =
      params.At("context").At("includeDeclaration").Truth().value_or(true);
  Locations locations(workspace);
  if (symbol->kind == WordKind::kDomain && isDeclarationWanted) {
    for (const std::string& path : FilesOfDomain(cursor->policy, symbol->name)) {
      locations.AddFile(path);
    }
  }
  for (const Mention& mention : FindMentions(cursor->policy, *symbol)) {
    if (isDeclarationWanted || !mention.Declares()) locations.Add(mention);
  }
  return locations.List();
}

}  // namespace SecPolicyCli
