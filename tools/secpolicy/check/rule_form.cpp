#include "rule_form.h"

#include <algorithm>
#include <array>

namespace SecPolicyCli {
namespace {

using Policy::WordKind;

// Of the policy of tardisks, which no domain has.
constexpr char kExceptionKeyword[] = "-E";
constexpr std::array kExceptionWords = {WordKind::kLabel, WordKind::kDomain};
constexpr LineForm kException = {.usage = "-E LABEL DOMAIN", .words = kExceptionWords};

Vocabulary& VocabularyOf(CheckRun& run, WordKind kind) {
  const auto known = run.vocabularies.find(kind);
  if (known != run.vocabularies.end()) return known->second;
  return run.vocabularies.emplace(kind, WordsOf(run, kind)).first->second;
}

Hint AskFor(const std::string& nearest) {
  if (nearest.empty()) return {};
  return {"did you mean '" + nearest + "'?", nearest};
}

Hint Suggest(CheckRun& run, WordKind kind, const std::string& word) {
  constexpr char kCapabilityPrefix[] = "cap_";
  Vocabulary& table = VocabularyOf(run, kind);
  const std::string nearest = table.Nearest(word);
  if (!nearest.empty() || kind != WordKind::kCapability) return AskFor(nearest);
  return AskFor(table.Nearest(kCapabilityPrefix + word));
}

// A short table is told as a whole when no word of it is near.
Hint SuggestOrList(CheckRun& run, WordKind kind, const std::string& word) {
  constexpr std::size_t kShortTable = 10;
  Hint suggestion = Suggest(run, kind, word);
  const Vocabulary& table = VocabularyOf(run, kind);
  if (!suggestion.text.empty() || table.Size() == 0 || table.Size() > kShortTable)
    return suggestion;
  std::string list = "one of";
  for (const std::string& candidate : WordsOf(run, kind)) list += " " + candidate;
  return list;
}

}  // namespace

std::vector<std::string> WordsOf(CheckRun& run, WordKind kind) {
  std::vector<std::string> words;
  if (kind == WordKind::kDomain) {
    for (const auto& [name, file] : run.domains) words.push_back(name);
  }
  const auto& table = Policy::FormOf(kind).table;
  if (!table) return words;
  for (const auto& [word, id] : run.access.GetKeywordsMap(*table)) words.push_back(word);
  return words;
}

std::optional<LineForm> FindLineForm(const std::string& keyword) {
  if (keyword == kExceptionKeyword) return kException;
  const Policy::RuleForm* const form = Policy::FindRuleForm(keyword);
  if (form == nullptr) return std::nullopt;
  return LineForm{.usage = form->usage, .words = form->Words()};
}

Hint HintForRule(CheckRun& run, const Code& code, const SourceFile::Words& words,
                 std::size_t index) {
  if (&code == &Codes::kRuleType) return "a line begins with one of -a -c -d -f -p -r -s -u";
  const auto form = FindLineForm(words.front());
  if (!form) return "";
  if (&code == &Codes::kArgumentCount) return std::string("write: ") + form->usage;
  if (index == 0 || index >= words.size()) return "";
  if (&code == &Codes::kGrantWord) {
    const Hint suggestion = AskFor(NearestWord(words[index], {"grant", "revoke"}));
    return suggestion.text.empty() ? "the last word is 'grant' or 'revoke'" : suggestion;
  }
  if (index > form->words.size()) return "";
  const WordKind kind = form->words[index - 1];
  if (kind == WordKind::kLabel) return HintForLabel(run, words[index]);
  return SuggestOrList(run, kind, words[index]);
}

Hint HintForLabel(CheckRun& run, const std::string& word) {
  const Hint suggestion = Suggest(run, WordKind::kLabel, word);
  return suggestion.text.empty() ? "labels are declared in objects/" : suggestion;
}

}  // namespace SecPolicyCli
