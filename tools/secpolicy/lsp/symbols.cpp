#include "cursor.h"
#include "features.h"
#include "protocol.h"

namespace SecPolicyCli {
namespace {

// Kinds of symbols, by the numbers of the protocol.
constexpr int kProperty = 7;
constexpr int kConstant = 14;

}  // namespace

Json ListSymbols(Workspace& workspace, const Json& params) {
  const std::string path = PathOfDocument(params);
  const auto role = workspace.RoleOf(path);
  if (!role) return {};
  const TextDocument text = workspace.TextOf(path);
  Json symbols = Json::Array();
  for (std::size_t number = 1; number <= text.LineCount(); ++number) {
    const std::vector<PlacedWord> words = PlaceWords(*role, text.Line(number));
    if (words.empty()) continue;
    std::string name;
    for (const PlacedWord& word : words) name += (name.empty() ? "" : " ") + word.text;
    const Span line{words.front().span.begin, words.back().span.end};
    const Json range = ToJson(text.RangeOf(SpanInText(text, number, line)));
    symbols.Append({{"name", name},
                    {"kind", role == FileRole::kObjectFile ? kConstant : kProperty},
                    {"range", range},
                    {"selectionRange", range}});
  }
  return symbols;
}

}  // namespace SecPolicyCli
