#include <algorithm>
#include <set>
#include <string_view>

#include "cursor.h"
#include "features.h"
#include "mentions.h"
#include "policy/call_set.h"
#include "protocol.h"
#include "sentence.h"
#include "text/format.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

using Policy::WordKind;

// What fits a small window.
constexpr std::size_t kMostShown = 8;

// The path of a file below the directory of the policy.
std::string ShortPath(const LivePolicy& policy, const std::string& path) {
  return path.starts_with(policy.Root()) ? path.substr(policy.Root().size() + 1) : path;
}

std::string PlaceOf(const LivePolicy& policy, const Mention& mention) {
  return ShortPath(policy, mention.file.source->Path()) + ":" + std::to_string(mention.line);
}

// What is written about an object beside its name.
std::string CommentOf(const Mention& mention) {
  const std::string_view line = mention.file.source->Text(mention.line);
  const std::size_t begin = line.find_first_not_of("# ", ReadPart(line).size());
  return begin == std::string_view::npos ? "" : Visible(line.substr(begin));
}

std::string DescribeLabel(LivePolicy& policy, const std::string& name,
                          const std::vector<Mention>& mentions) {
  const auto declaration = std::ranges::find_if(mentions, &Mention::Declares);
  if (declaration != mentions.end()) {
    const std::string comment = CommentOf(*declaration);
    return "an object of `" + PlaceOf(policy, *declaration) + "`" +
           (comment.empty() ? "" : ": " + comment);
  }
  const bool isBuiltIn =
      policy.Tables().access.IsPredefinedLabel(name, TeskCtl::Security::TESKACCESS_LABEL_OBJECT);
  return isBuiltIn ? "a label that is built in" : "a label that no file declares";
}

std::string DescribeDomain(const LivePolicy& policy, const std::string& name) {
  std::string files;
  for (const PolicyFile& file : policy.Files()) {
    if (file.role != FileRole::kDomainFile || file.domain != name) continue;
    files += (files.empty() ? "`" : ", `") + ShortPath(policy, file.source->Path()) + "` (" +
             CountOf(file.source->Lines().size(), "rule") + ")";
  }
  return files.empty() ? "a domain that no file defines" : "a domain, defined by " + files;
}

std::string ListOf(std::span<const std::string_view> words) {
  std::string list;
  for (const std::string_view word : words)
    list.append(list.empty() ? "`" : ", `").append(word) += '`';
  return list;
}

std::string DescribeCall(const std::string& name) {
  if (const Policy::CallSet* const set = Policy::FindCallSet(name)) {
    return std::string(set->purpose) + ": " + ListOf(set->members);
  }
  std::vector<std::string_view> sets;
  for (const Policy::CallSet& set : Policy::CallSets()) {
    if (set.Has(name)) sets.emplace_back(set.name);
  }
  return sets.empty() ? "a system call that is in no set" : "a system call of " + ListOf(sets);
}

std::string Describe(LivePolicy& policy, const Symbol& symbol,
                     const std::vector<Mention>& mentions) {
  if (symbol.kind == WordKind::kLabel) return DescribeLabel(policy, symbol.name, mentions);
  if (symbol.kind == WordKind::kDomain) return DescribeDomain(policy, symbol.name);
  if (symbol.kind == WordKind::kSyscall) return DescribeCall(symbol.name);
  return std::string("a ") + Policy::FormOf(symbol.kind).plainNoun;
}

bool AreInOneLine(const Mention& one, const Mention& other) {
  return one.file.source == other.file.source && one.line == other.line;
}

// Other lines that speak of it than the one of the cursor, each once.
std::string ListOthers(const LivePolicy& policy, const std::vector<Mention>& mentions,
                       const Cursor& cursor) {
  std::string list;
  std::size_t count = 0;
  const Mention* last = nullptr;
  for (const Mention& mention : mentions) {
    const bool isOwn = mention.file.source->Path() == cursor.path && mention.line == cursor.line;
    if (isOwn || mention.Declares() || (last != nullptr && AreInOneLine(*last, mention))) continue;
    last = &mention;
    if (++count > kMostShown) continue;
    std::string words;
    for (const std::string& word : mention.file.source->Lines().at(mention.line)) {
      words += (words.empty() ? "" : " ") + word;
    }
    list += "- `" + PlaceOf(policy, mention) + "`: `" + Visible(words) + "`\n";
  }
  if (count == 0) return "";
  if (count > kMostShown) list += "- " + std::to_string(count - kMostShown) + " more\n";
  return "\nAlso in " + CountOf(count, "other line") + ":\n\n" + list;
}

std::string DescribeWord(const Cursor& cursor) {
  const auto symbol = cursor.word == nullptr ? std::nullopt : SymbolOf(cursor.policy, *cursor.word);
  if (!symbol) return "";
  const std::vector<Mention> mentions = FindMentions(cursor.policy, *symbol);
  return "\n`" + Visible(symbol->name) + "`: " + Describe(cursor.policy, *symbol, mentions) + "\n" +
         ListOthers(cursor.policy, mentions, cursor);
}

}  // namespace

Json Hover(Workspace& workspace, const Json& params) {
  const auto cursor = FindCursor(workspace, params);
  if (!cursor || cursor->word == nullptr) return {};
  const std::string sentence =
      ExplainLine(cursor->role, Workspace::DomainOf(cursor->path), cursor->words);
  const std::string text = (sentence.empty() ? "" : sentence + "\n") + DescribeWord(*cursor);
  if (text.empty()) return {};
  return {{"contents", {{"kind", "markdown"}, {"value", text}}},
          {"range", ToJson(cursor->RangeOf(*cursor->word))}};
}

}  // namespace SecPolicyCli
