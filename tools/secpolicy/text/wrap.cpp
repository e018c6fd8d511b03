#include "wrap.h"

#include <algorithm>
#include <vector>

#include "visible.h"

namespace SecPolicyCli {
namespace {

constexpr std::size_t kLeastRoom = 14;

// Where the last column of a line begins: behind the last gap of two blanks, or where its text
// does. A column that leaves little room is none.
std::size_t LastColumn(std::string_view line, std::size_t columns) {
  const std::size_t begin = std::min(line.find_first_not_of(' '), line.size());
  const std::size_t gap = line.rfind("  ");
  if (gap == std::string_view::npos || gap < begin || gap + kLeastRoom > columns) return begin;
  return gap + 2;
}

void AppendWrapped(std::string& wrapped, std::string_view line, std::size_t columns) {
  const std::size_t indent = LastColumn(line, columns);
  std::size_t width = CountCharacters(line.substr(0, indent));
  wrapped += line.substr(0, indent);
  bool isFirst = true;
  for (std::string_view rest = line.substr(indent); !rest.empty();) {
    const std::string_view word = rest.substr(0, rest.find(' '));
    rest.remove_prefix(std::min(word.size() + 1, rest.size()));
    const std::size_t wordWidth = CountCharacters(word);
    if (!isFirst && width + 1 + wordWidth > columns) {
      wrapped += '\n' + std::string(indent, ' ');
      width = indent;
    } else if (!isFirst) {
      wrapped += ' ';
      ++width;
    }
    wrapped += word;
    width += wordWidth;
    isFirst = false;
  }
  wrapped += '\n';
}

bool IsProse(std::string_view line) {
  return !line.empty() && std::string_view(" |#-`").find(line.front()) == std::string_view::npos &&
         !line.starts_with("Usage:");
}

using Lines = std::vector<std::string_view>;

// Lines that belong together, and fit.
void AppendLines(std::string& wrapped, const Lines& lines, std::size_t columns) {
  const bool allFit =
      std::ranges::all_of(lines, [&](auto line) { return CountCharacters(line) <= columns; });
  std::string filled;
  for (const std::string_view line : lines) {
    if (allFit) wrapped.append(line) += '\n';
    filled.append(filled.empty() ? "" : " ") += line;
  }
  if (!allFit) AppendWrapped(wrapped, filled, columns);
}

}  // namespace

std::string Wrap(std::string_view text, std::size_t columns) {
  std::string wrapped;
  Lines prose;
  bool isFenced = false;
  const bool endsLine = text.ends_with('\n');
  while (!text.empty()) {
    const std::string_view line = text.substr(0, text.find('\n'));
    text.remove_prefix(std::min(line.size() + 1, text.size()));
    if (line.starts_with("```")) isFenced = !isFenced;
    if (!isFenced && IsProse(line)) {
      prose.push_back(line);
      continue;
    }
    AppendLines(wrapped, prose, columns);
    prose.clear();
    if (isFenced) {
      wrapped.append(line) += '\n';
    } else {
      AppendLines(wrapped, {line}, columns);
    }
  }
  AppendLines(wrapped, prose, columns);
  if (!endsLine && !wrapped.empty()) wrapped.pop_back();
  return wrapped;
}

}  // namespace SecPolicyCli
