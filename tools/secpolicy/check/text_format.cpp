#include <algorithm>
#include <iomanip>
#include <string>
#include <string_view>

#include "report_format.h"
#include "root.h"
#include "terminal/color.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// Of a long line, what is shown before and in all.
constexpr std::size_t kShownBefore = 60;
constexpr std::size_t kShownWidth = 100;

// What fits a screen needs no overview.
constexpr std::size_t kFewProblems = 10;

// The line, and below it a mark under the characters that the problem is about.
void WriteExcerpt(const Diagnostic& diagnostic, std::ostream& output) {
  const std::size_t first = diagnostic.column > kShownBefore ? diagnostic.column - kShownBefore : 1;
  const std::size_t end = diagnostic.column + std::max<std::size_t>(diagnostic.length, 1);
  std::string excerpt = first > 1 ? "..." : "";
  std::string marks(excerpt.size(), ' ');
  std::string_view rest = diagnostic.source;
  for (std::size_t column = 1; !rest.empty() && column < first + kShownWidth; ++column) {
    const std::string_view character = TakeCharacter(rest);
    if (column < first) continue;
    const std::size_t columns = AppendVisible(excerpt, character);
    const bool marked = column >= diagnostic.column && column < end;
    marks.append(columns, !marked ? ' ' : column == diagnostic.column ? '^' : '~');
  }
  if (!rest.empty()) excerpt += "...";
  marks.erase(marks.find_last_not_of(' ') + 1);
  output << "    " << excerpt << "\n    " << Painted{Color::kGood, marks} << '\n';
}

Painted Paint(Severity severity) {
  return {severity == Severity::kError ? Color::kBad : Color::kDoubtful, SeverityName(severity)};
}

void WriteTally(const DiagnosticList& diagnostics, std::ostream& output) {
  if (diagnostics.Count() <= kFewProblems) return;
  output << '\n';
  for (const auto& [code, count] : diagnostics.Tally()) {
    output << std::setw(6) << count << ' ' << std::left << std::setw(8) << Paint(code->severity)
           << std::setw(20) << code->name << std::right << code->summary << '\n';
  }
}

}  // namespace

void WriteText(const DiagnosticList& diagnostics, std::ostream& output) {
  for (const Diagnostic& diagnostic : diagnostics.Shown()) {
    output << Visible(OutsidePath(diagnostic.file)) << ':';
    if (diagnostic.line > 0) output << diagnostic.line << ':' << diagnostic.column << ':';
    output << ' ' << Paint(diagnostic.code->severity) << ": " << Visible(diagnostic.message) << " ["
           << diagnostic.code->name << "]\n";
    if (diagnostic.line > 0) WriteExcerpt(diagnostic, output);
    const std::string& hint = diagnostic.hint.text;
    if (!hint.empty()) output << "    hint: " << Visible(hint) << '\n';
  }
  WriteTally(diagnostics, output);
}

}  // namespace SecPolicyCli
