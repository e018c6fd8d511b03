#include <algorithm>
#include <filesystem>
#include <map>
#include <system_error>

#include "cursor.h"
#include "edit.h"
#include "features.h"
#include "mentions.h"
#include "protocol.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

using Policy::WordKind;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

constexpr std::uint32_t kNoSuchLabel = 1;
constexpr char kStartDomain[] = "hostDom";

[[noreturn]] void RefuseRename(const std::string& why) {
  throw RequestError(ErrorCode::kRequestFailed, why);
}

bool IsNeeded(const std::string& domain) {
  return domain == kStartDomain || std::ranges::find(SecPolicy::kNeededDomains, domain) !=
                                       std::end(SecPolicy::kNeededDomains);
}

// What is at the cursor, which can be renamed.
Symbol RequireSymbol(const Cursor* cursor) {
  const auto symbol = cursor != nullptr && cursor->word != nullptr
                          ? SymbolOf(cursor->policy, *cursor->word)
                          : std::nullopt;
  if (!symbol || (symbol->kind != WordKind::kLabel && symbol->kind != WordKind::kDomain)) {
    RefuseRename("only labels and domains can be renamed");
  }
  auto& access = cursor->policy.Tables().access;
  if (symbol->kind == WordKind::kLabel &&
      access.IsPredefinedLabel(symbol->name, TESKACCESS_LABEL_OBJECT)) {
    RefuseRename("the label '" + symbol->name + "' is built in");
  }
  if (symbol->kind == WordKind::kDomain && IsNeeded(symbol->name)) {
    RefuseRename("every host needs the domain '" + symbol->name + "'");
  }
  return *symbol;
}

// A word that the library reads as it is written, and that is none of another system's line ends.
void RequireWord(const std::string& name) {
  const bool isWord = !name.empty() && std::ranges::none_of(name, [](unsigned char letter) {
    return letter <= ' ' || letter == '#' || letter == 0x7f;
  });
  if (!isWord) RefuseRename("'" + name + "' is no word of a policy file");
}

void RequireFileName(const std::string& name) {
  if (name.find('/') == std::string::npos && name != "." && name != "..") return;
  RefuseRename("'" + name + "' is no name of a file");
}

// The host is asked: it knows what it takes for a name.
void RequireNewName(LivePolicy& policy, WordKind kind, const std::string& name) {
  CheckRun& tables = policy.Tables();
  unsigned int id = 0;
  if (tables.access.LookupLabel(name, TESKACCESS_LABEL_OBJECT) != kNoSuchLabel) {
    RefuseRename("there is a label '" + name + "' already");
  }
  if (tables.access.FindDomain(name, &id)) {
    RefuseRename("there is a domain '" + name + "' already");
  }
  policy.Forget();
  try {
    if (kind == WordKind::kLabel) {
      tables.access.AddLabels({name}, TESKACCESS_LABEL_OBJECT);
    } else {
      tables.access.CreateDomain(name, TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
    }
  } catch (const Braxo::Lib::BraxoException& refusal) {
    RefuseRename(refusal.what());
  }
}

// The path of the file that defines the domain after it is called `name`.
std::string RenamedFile(const std::string& path, const std::string& name) {
  constexpr std::string_view kPrefix = SecPolicy::kPartnerPrefix;
  const std::filesystem::path dir = std::filesystem::path(path).parent_path();
  const bool isPartner = dir.filename() == SecPolicy::kPartnersDir;
  if (isPartner && (!name.starts_with(kPrefix) || name == kPrefix)) {
    RefuseRename("the name of a partner domain begins with '" + std::string(kPrefix) + "'");
  }
  std::string renamed = dir / (isPartner ? name.substr(kPrefix.size()) : name);
  std::error_code ignored;
  if (std::filesystem::exists(std::filesystem::symlink_status(renamed, ignored))) {
    RefuseRename("there is a file " + renamed + " already");
  }
  return renamed;
}

void RenameFiles(const LivePolicy& policy, const std::string& domain, const std::string& name,
                 bool canRename, WorkspaceEdit& edit) {
  if (!canRename) RefuseRename("this editor cannot rename the file of a domain");
  for (const std::string& path : FilesOfDomain(policy, domain)) {
    edit.RenameFile(path, RenamedFile(path, name));
  }
}

}  // namespace

Json PrepareRename(Workspace& workspace, const Json& params) {
  const auto cursor = FindCursor(workspace, params);
  const Symbol symbol = RequireSymbol(cursor.get());
  return {{"range", ToJson(cursor->RangeOf(*cursor->word))}, {"placeholder", symbol.name}};
}

Json Rename(Workspace& workspace, const Json& params) {
  const auto cursor = FindCursor(workspace, params);
  const Symbol symbol = RequireSymbol(cursor.get());
  const std::string& name = ReadString(params, "newName");
  RequireWord(name);
  if (symbol.kind == WordKind::kDomain) RequireFileName(name);
  RequireNewName(cursor->policy, symbol.kind, name);
  WorkspaceEdit edit(workspace);
  std::map<std::string, TextDocument> texts;
  for (const Mention& mention : FindMentions(cursor->policy, symbol)) {
    const std::string& path = mention.file.source->Path();
    const auto [text, isNew] = texts.try_emplace(path, "");
    if (isNew) text->second = workspace.TextOf(path);
    edit.Replace(path, text->second.RangeOf(SpanInText(text->second, mention.line, mention.span)),
                 name);
  }
  if (symbol.kind == WordKind::kDomain) {
    RenameFiles(cursor->policy, symbol.name, name, workspace.editor.renamesFiles, edit);
  }
  return edit.ToJson();
}

}  // namespace SecPolicyCli
