#include "text_document.h"

#include <algorithm>
#include <utility>

#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// How many units of UTF-16 a character takes that TakeCharacter took: those of four bytes lie
// beyond what one holds.
std::size_t UnitsOf(std::string_view character) { return character.size() == 4 ? 2 : 1; }

// The index of the last of the beginnings that is not behind `offset`.
std::size_t IndexAt(const std::vector<std::size_t>& beginnings, std::size_t offset) {
  const auto next = std::ranges::upper_bound(beginnings, offset);
  return static_cast<std::size_t>(next - beginnings.begin()) - 1;
}

}  // namespace

TextDocument::TextDocument(std::string content) : text(std::move(content)) { FindLines(); }

void TextDocument::FindLines() {
  lines = {0};
  editorLines = {0};
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] == '\n') lines.push_back(i + 1);
    const bool isPair = text[i] == '\r' && i + 1 < text.size() && text[i + 1] == '\n';
    if (text[i] == '\n' || (text[i] == '\r' && !isPair)) editorLines.push_back(i + 1);
  }
}

std::size_t TextDocument::OffsetAt(Position position) const {
  if (position.line >= editorLines.size()) return text.size();
  std::size_t offset = editorLines[position.line];
  const bool isLast = position.line + 1 == editorLines.size();
  const std::size_t next = isLast ? text.size() : editorLines[position.line + 1];
  std::string_view rest = std::string_view(text).substr(offset, next - offset);
  std::size_t left = position.character;
  while (!rest.empty() && rest.front() != '\r' && rest.front() != '\n') {
    const std::string_view character = TakeCharacter(rest);
    if (left < UnitsOf(character)) break;
    left -= UnitsOf(character);
    offset += character.size();
  }
  return offset;
}

Position TextDocument::PositionAt(std::size_t offset) const {
  offset = std::min(offset, text.size());
  Position position{.line = IndexAt(editorLines, offset), .character = 0};
  const std::size_t begin = editorLines[position.line];
  std::string_view rest = std::string_view(text).substr(begin, offset - begin);
  while (!rest.empty() && rest.front() != '\r') position.character += UnitsOf(TakeCharacter(rest));
  return position;
}

void TextDocument::Replace(Range range, std::string_view replacement) {
  const std::size_t begin = OffsetAt(range.start);
  const std::size_t end = std::max(begin, OffsetAt(range.end));
  text.replace(begin, end - begin, replacement);
  FindLines();
}

std::size_t TextDocument::LineAt(std::size_t offset) const { return IndexAt(lines, offset) + 1; }

Span TextDocument::LineSpan(std::size_t number) const {
  if (number == 0 || number > lines.size()) return {text.size(), text.size()};
  const bool isLast = number == lines.size();
  return {lines[number - 1], isLast ? text.size() : lines[number] - 1};
}

std::string_view TextDocument::Line(std::size_t number) const {
  const Span span = LineSpan(number);
  return std::string_view(text).substr(span.begin, span.end - span.begin);
}

}  // namespace SecPolicyCli
