#include "cursor.h"

#include <algorithm>
#include <utility>

#include "protocol.h"

namespace SecPolicyCli {

Span SpanInText(const TextDocument& text, std::size_t line, Span word) {
  const std::size_t begin = text.LineSpan(line).begin;
  return {begin + word.begin, begin + word.end};
}

Range Cursor::RangeOf(const PlacedWord& placed) const {
  return text.RangeOf(SpanInText(text, line, placed.span));
}

std::string PathOfDocument(const Json& params) {
  const std::string& uri = ReadString(params.At("textDocument"), "uri");
  if (auto path = Workspace::PathOf(uri)) return std::move(*path);
  throw RequestError(ErrorCode::kInvalidParams, uri + " is no file below the root");
}

std::unique_ptr<const Cursor> FindCursor(Workspace& workspace, const Json& params) {
  const std::string path = PathOfDocument(params);
  const Position position = ReadPosition(params.At("position"));
  const auto role = workspace.RoleOf(path);
  LivePolicy* const policy = role ? workspace.PolicyOf(path) : nullptr;
  if (policy == nullptr) return nullptr;
  const TextDocument text = workspace.TextOf(path);
  const std::size_t offset = text.OffsetAt(position);
  const std::size_t line = text.LineAt(offset);
  const std::size_t column = offset - text.LineSpan(line).begin;
  auto cursor = std::make_unique<Cursor>(Cursor{*policy, path, *role, text, line, column,
                                                PlaceWords(*role, text.Line(line)), nullptr});
  const auto word = std::ranges::find_if(cursor->words, [&](const PlacedWord& placed) {
    return placed.span.begin <= column && column <= placed.span.end;
  });
  if (word != cursor->words.end()) cursor->word = &*word;
  return cursor;
}

}  // namespace SecPolicyCli
