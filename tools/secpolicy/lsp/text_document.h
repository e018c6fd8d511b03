#pragma once

#include <compare>
#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace SecPolicyCli {

// A place between two characters as editors count: lines from 0, which end with a line feed, a
// carriage return or both, and in them units of UTF-16.
struct Position {
  std::size_t line = 0;
  std::size_t character = 0;

  auto operator<=>(const Position&) const = default;
};

struct Range {
  Position start;
  Position end;
};

// What of the text of a file, in bytes.
struct Span {
  std::size_t begin = 0;
  std::size_t end = 0;
};

// The text of a file, where editors and the library count lines otherwise: to the library only a
// line feed ends one. A byte that is no UTF-8 counts as one unit.
class TextDocument {
 public:
  explicit TextDocument(std::string content);

  const std::string& Text() const { return text; }

  // Of a place behind the end of a line or of the text, the end; within a character, its beginning.
  std::size_t OffsetAt(Position position) const;
  Position PositionAt(std::size_t offset) const;

  Range RangeOf(Span span) const { return {PositionAt(span.begin), PositionAt(span.end)}; }

  // Puts `replacement` in place of the range; of one that ends before it starts, at its start.
  void Replace(Range range, std::string_view replacement);

  // The lines of the library. Their numbers count from 1.
  std::size_t LineCount() const { return lines.size(); }
  std::size_t LineAt(std::size_t offset) const;
  Span LineSpan(std::size_t number) const;  // without the line feed; empty behind the last
  std::string_view Line(std::size_t number) const;

 private:
  void FindLines();

  std::string text;
  std::vector<std::size_t> lines;        // where each begins
  std::vector<std::size_t> editorLines;  // the same as editors count
};

}  // namespace SecPolicyCli
