#include "format.h"

#include <algorithm>
#include <span>
#include <string_view>
#include <utility>

#include "policy/limits.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

constexpr std::size_t kCommentGap = 3;

// The lines of a file, whose columns are found group by group.
class Columns {
 public:
  Columns(FileRole fileRole, const TextDocument& text) : role(fileRole) {
    for (std::size_t number = 1; number <= text.LineCount(); ++number) {
      lines.emplace_back(text.Line(number));
      if (lines.back().size() > Policy::kLongestLine) isCut = true;
      rows.push_back(isCut ? Row{} : ReadRow(lines.back()));
    }
  }

  std::vector<std::string> Format() {
    for (std::size_t begin = 0; begin < rows.size();) {
      const std::size_t end = EndOfGroup(begin);
      Align(begin, end);
      begin = end;
    }
    return std::move(lines);
  }

 private:
  // A line as its words and what follows them; none for one that stays as it is.
  struct Row {
    std::vector<std::string> words;
    std::string verdict;  // the last word of most rules, whose other words may be fewer
    std::string comment;
  };

  Row ReadRow(std::string& line) const {
    if (line.find('\0') != std::string::npos) return {};
    Row row;
    for (PlacedWord& word : PlaceWords(role, line)) row.words.push_back(std::move(word.text));
    if (role == FileRole::kDomainFile && row.words.size() > 1 && IsGrantWord(row.words.back())) {
      row.verdict = std::move(row.words.back());
      row.words.pop_back();
    }
    const std::size_t end = line.find_last_not_of(' ');
    line.erase(end == std::string::npos ? 0 : end + 1);
    row.comment = line.substr(std::min(ReadPart(line).size(), line.size()));
    return row;
  }

  // Rules of one kind that stand together; lines without a kind are set apart by nothing but rules.
  std::size_t EndOfGroup(std::size_t begin) const {
    const bool isOfRules = role == FileRole::kDomainFile || role == FileRole::kTardiskFile;
    std::size_t end = begin + 1;
    if (!isOfRules) return rows.size();
    if (rows[begin].words.empty()) return end;
    while (end < rows.size() && !rows[end].words.empty() &&
           rows[end].words.front() == rows[begin].words.front()) {
      ++end;
    }
    return end;
  }

  // Where the words of a group stand.
  struct Layout {
    std::vector<std::size_t> widths;  // of the columns
    std::size_t verdictColumn = 0;
    std::size_t commentColumn = 0;
  };

  static Layout LayOut(std::span<const Row> group) {
    Layout layout;
    for (const Row& row : group) {
      layout.widths.resize(std::max(layout.widths.size(), row.words.size()));
      for (std::size_t i = 0; i < row.words.size(); ++i) {
        layout.widths[i] = std::max(layout.widths[i], CountCharacters(row.words[i]));
      }
    }
    for (const Row& row : group) {
      if (row.verdict.empty()) continue;
      const std::size_t width = CountCharacters(Join(row.words, layout.widths));
      layout.verdictColumn = std::max(layout.verdictColumn, width + 1);
    }
    for (const Row& row : group) {
      const std::size_t width = CountCharacters(JoinRule(row, layout));
      layout.commentColumn = std::max(layout.commentColumn, width + kCommentGap);
    }
    return layout;
  }

  void Align(std::size_t begin, std::size_t end) {
    const Layout layout = LayOut(std::span(rows).subspan(begin, end - begin));
    for (std::size_t index = begin; index < end; ++index) {
      if (rows[index].words.empty()) continue;
      std::string line = Write(rows[index], layout);
      // What would be too long to be read is set apart by single spaces, as far as that helps.
      if (line.size() > Policy::kLongestLine) line = Write(rows[index], {});
      if (line.size() <= Policy::kLongestLine) lines[index] = std::move(line);
    }
  }

  static std::string Write(const Row& row, const Layout& layout) {
    return Append(JoinRule(row, layout), layout.commentColumn, row.comment);
  }

  static std::string Join(const std::vector<std::string>& words,
                          const std::vector<std::size_t>& widths) {
    std::string line;
    for (std::size_t i = 0; i < words.size(); ++i) {
      line += words[i];
      if (i + 1 == words.size()) break;
      const std::size_t width = CountCharacters(words[i]);
      line.append(i < widths.size() ? widths[i] - width + 1 : 1, ' ');
    }
    return line;
  }

  static std::string JoinRule(const Row& row, const Layout& layout) {
    return Append(Join(row.words, layout.widths), layout.verdictColumn, row.verdict);
  }

  // With `addition`, if any, at the column or, behind a longer line, one space away.
  static std::string Append(std::string line, std::size_t column, const std::string& addition) {
    if (addition.empty()) return line;
    const std::size_t width = CountCharacters(line);
    line.append(column > width ? column - width : 1, ' ');
    return line + addition;
  }

  FileRole role;
  bool isCut = false;
  std::vector<std::string> lines;
  std::vector<Row> rows;
};

}  // namespace

std::vector<std::string> FormatLines(FileRole role, const TextDocument& text) {
  return Columns(role, text).Format();
}

}  // namespace SecPolicyCli
