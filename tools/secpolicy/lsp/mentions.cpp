#include "mentions.h"

#include <algorithm>

namespace SecPolicyCli {

using Policy::WordKind;

std::optional<Symbol> SymbolOf(LivePolicy& policy, const PlacedWord& word) {
  if (!word.kind || *word.kind == WordKind::kNumber) return std::nullopt;
  const CheckRun& tables = policy.Tables();
  const bool isDomain = *word.kind == WordKind::kLabel && !tables.objects.contains(word.text) &&
                        tables.domains.contains(word.text);
  return Symbol{isDomain ? WordKind::kDomain : *word.kind, word.text};
}

std::vector<Mention> FindMentions(LivePolicy& policy, const Symbol& symbol) {
  std::vector<Mention> mentions;
  for (const PolicyFile& file : policy.Files()) {
    for (const auto& [number, words] : file.source->Lines()) {
      if (std::ranges::find(words, symbol.name) == words.end()) continue;
      for (const PlacedWord& word : PlaceWords(file.role, file.source->Text(number))) {
        if (word.text == symbol.name && SymbolOf(policy, word) == symbol) {
          mentions.push_back({file, number, word.span});
        }
      }
    }
  }
  return mentions;
}

std::vector<std::string> FilesOfDomain(const LivePolicy& policy, const std::string& domain) {
  std::vector<std::string> paths;
  for (const PolicyFile& file : policy.Files()) {
    if (file.role == FileRole::kDomainFile && file.domain == domain)
      paths.push_back(file.source->Path());
  }
  return paths;
}

}  // namespace SecPolicyCli
