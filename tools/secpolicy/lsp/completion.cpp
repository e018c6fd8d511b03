#include <algorithm>
#include <filesystem>
#include <system_error>

#include "check/rule_form.h"
#include "cursor.h"
#include "features.h"
#include "policy/call_set.h"
#include "policy/rule_kind.h"
#include "protocol.h"

namespace SecPolicyCli {
namespace {

using Policy::WordKind;

// Kinds of items, by the numbers of the protocol.
enum class ItemKind {
  kFunction = 3,
  kModule = 9,
  kKeyword = 14,
  kFile = 17,
  kFolder = 19,
  kEnumMember = 20,
  kConstant = 21,
};

// A directory may have any number of entries.
constexpr std::size_t kMostEntries = 1000;

ItemKind ItemKindOf(WordKind kind) {
  switch (kind) {
    case WordKind::kLabel:
      return ItemKind::kConstant;
    case WordKind::kDomain:
      return ItemKind::kModule;
    case WordKind::kSyscall:
      return ItemKind::kFunction;
    default:
      return ItemKind::kEnumMember;
  }
}

// The items for the word that the cursor ends.
class Items {
 public:
  Items(const Cursor& at, Span replaced)
      : range(at.text.RangeOf(SpanInText(at.text, at.line, replaced))) {}

  void Add(const std::string& word, ItemKind kind, const std::string& detail = {}) {
    Json item = {{"label", word},
                 {"kind", static_cast<int>(kind)},
                 {"filterText", word},
                 {"textEdit", TextEdit(range, word)}};
    if (!detail.empty()) item["detail"] = detail;
    list.Append(item);
  }

  Json List(bool isIncomplete) const { return {{"isIncomplete", isIncomplete}, {"items", list}}; }

 private:
  Range range;
  Json list = Json::Array();
};

void AddKeywords(FileRole role, Items& items) {
  if (role == FileRole::kTardiskFile) return items.Add("-E", ItemKind::kKeyword, "-E LABEL DOMAIN");
  for (const Policy::RuleForm& form : Policy::kRuleForms) {
    items.Add(form.keyword, ItemKind::kKeyword, form.usage);
  }
}

void AddWords(CheckRun& tables, WordKind kind, Items& items) {
  for (const std::string& word : WordsOf(tables, kind)) {
    const Policy::CallSet* const set =
        kind == WordKind::kSyscall ? Policy::FindCallSet(word) : nullptr;
    items.Add(word, ItemKindOf(kind),
              set == nullptr ? Policy::FormOf(kind).plainNoun : set->purpose);
  }
}

// What is in the directory that `begun` names so far.
void AddPaths(const std::string& begun, bool areTreesWanted, Items& items) {
  const std::string dir = begun.substr(0, begun.rfind('/') + 1);
  const std::string begunName = begun.substr(dir.size());
  if (!dir.starts_with('/')) {
    items.Add("/", ItemKind::kFolder);
    return;
  }
  std::vector<std::pair<std::string, bool>> entries;
  std::error_code failure;
  std::filesystem::directory_iterator entry(dir, failure);
  for (; !failure && entry != std::filesystem::directory_iterator(); entry.increment(failure)) {
    const std::string name = entry->path().filename();
    // What the library would read as something else cannot be written.
    if (!name.starts_with(begunName) || name.find_first_of(" #\n\t\r") != std::string::npos)
      continue;
    std::error_code unknown;
    entries.emplace_back(name, entry->is_directory(unknown));
  }
  std::ranges::sort(entries);
  entries.resize(std::min(entries.size(), kMostEntries));
  if (areTreesWanted) items.Add(dir + "*", ItemKind::kFolder, "the directory and all beneath it");
  for (const auto& [name, isDirectory] : entries) {
    items.Add(dir + name, isDirectory ? ItemKind::kFolder : ItemKind::kFile);
  }
}

void AddVerdicts(const Expected& expected, Items& items) {
  if (expected.verdict) {
    items.Add("grant", ItemKind::kKeyword);
    items.Add("revoke", ItemKind::kKeyword);
  }
  if (!expected.permissions) return;
  for (const char* letters : {"r", "rw", "rx", "rwx", "w", "wx", "x"}) {
    items.Add(letters, ItemKind::kKeyword);
  }
}

}  // namespace

Json CompleteWord(Workspace& workspace, const Json& params) {
  const auto cursor = FindCursor(workspace, params);
  if (!cursor) return {};
  const std::string_view before = cursor->text.Line(cursor->line).substr(0, cursor->column);
  if (ReadPart(before).size() < before.size()) return {};
  std::vector<PlacedWord> words = PlaceWords(cursor->role, before);
  PlacedWord begun{.text = "", .span = {cursor->column, cursor->column}};
  if (!words.empty() && words.back().span.end == cursor->column) {
    begun = words.back();
    words.pop_back();
  }
  const Expected expected = ExpectedAfter(cursor->role, words);
  Items items(*cursor, begun.span);
  bool isIncomplete = false;
  if (expected.keyword) AddKeywords(cursor->role, items);
  if (expected.kind == WordKind::kPath) {
    AddPaths(begun.text, cursor->role == FileRole::kLabelFile, items);
    isIncomplete = true;  // of what lies deeper nothing was told
  } else if (expected.kind && cursor->role != FileRole::kObjectFile) {
    AddWords(cursor->policy.Tables(), *expected.kind, items);
  }
  AddVerdicts(expected, items);
  return items.List(isIncomplete);
}

}  // namespace SecPolicyCli
