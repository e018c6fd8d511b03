#include "format.h"

#include <algorithm>
#include <string_view>
#include <utility>

#include "cursor.h"
#include "features.h"
#include "protocol.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

constexpr std::size_t kLongestLine = 1023;
constexpr std::size_t kCommentGap = 3;

// The lines of a file, whose columns are found group by group.
class Columns {
 public:
  Columns(FileRole fileRole, const TextDocument& text) : role(fileRole) {
    for (std::size_t number = 1; number <= text.LineCount(); ++number) {
      lines.emplace_back(text.Line(number));
      if (lines.back().size() > kLongestLine) isCut = true;
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

  void Align(std::size_t begin, std::size_t end) {
    std::vector<std::size_t> widths;
    for (std::size_t index = begin; index < end; ++index) {
      const auto& words = rows[index].words;
      widths.resize(std::max(widths.size(), words.size()));
      for (std::size_t i = 0; i < words.size(); ++i) {
        widths[i] = std::max(widths[i], CountCharacters(words[i]));
      }
    }
    std::size_t verdictColumn = 0;
    for (std::size_t index = begin; index < end; ++index) {
      if (rows[index].verdict.empty()) continue;
      const std::size_t width = CountCharacters(Join(rows[index].words, widths));
      verdictColumn = std::max(verdictColumn, width + 1);
    }
    std::size_t commentColumn = 0;
    for (std::size_t index = begin; index < end; ++index) {
      const std::string rule = JoinRule(rows[index], widths, verdictColumn);
      commentColumn = std::max(commentColumn, CountCharacters(rule) + kCommentGap);
    }
    for (std::size_t index = begin; index < end; ++index) {
      const Row& row = rows[index];
      if (row.words.empty()) continue;
      const std::string line =
          Append(JoinRule(row, widths, verdictColumn), commentColumn, row.comment);
      const std::string narrow = Append(JoinRule(row, {}, 0), 0, row.comment);
      // What would be too long to be read is set apart by single spaces, as far as that helps.
      if (line.size() <= kLongestLine) {
        lines[index] = line;
      } else if (narrow.size() <= kLongestLine) {
        lines[index] = narrow;
      }
    }
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

  static std::string JoinRule(const Row& row, const std::vector<std::size_t>& widths,
                              std::size_t verdictColumn) {
    return Append(Join(row.words, widths), verdictColumn, row.verdict);
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

bool Touches(Range wanted, Range line) {
  return wanted.start.line <= line.end.line && line.start.line <= wanted.end.line;
}

}  // namespace

std::vector<std::string> FormatLines(FileRole role, const TextDocument& text) {
  return Columns(role, text).Format();
}

Json FormatDocument(Workspace& workspace, const Json& params) {
  const std::string path = PathOfDocument(params);
  const auto role = workspace.RoleOf(path);
  if (!role) return {};
  const Json& wanted = params.At("range");
  const TextDocument text = workspace.TextOf(path);
  const std::vector<std::string> lines = FormatLines(*role, text);
  Json edits = Json::Array();
  for (std::size_t number = 1; number <= lines.size(); ++number) {
    Span span = text.LineSpan(number);
    std::string_view line = lines[number - 1];
    std::string_view before = text.Line(number);
    // To an editor, a carriage return there is no part of the line.
    if (line.ends_with('\r') && before.ends_with('\r')) {
      line.remove_suffix(1);
      before.remove_suffix(1);
      --span.end;
    }
    const Range range = text.RangeOf(span);
    const bool isWanted = wanted.IsNull() || Touches(ReadRange(wanted), range);
    if (isWanted && line != before) edits.Append(TextEdit(range, std::string(line)));
  }
  const bool lacksEnd = !text.Text().empty() && !text.Text().ends_with('\n');
  if (wanted.IsNull() && lacksEnd) {
    const std::size_t end = text.Text().size();
    edits.Append(TextEdit(text.RangeOf({end, end}), "\n"));
  }
  return edits;
}

}  // namespace SecPolicyCli
