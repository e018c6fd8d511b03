#include <string>
#include <string_view>
#include <vector>

#include "cursor.h"
#include "features.h"
#include "format.h"
#include "protocol.h"

namespace SecPolicyCli {
namespace {

bool Touches(Range wanted, Range line) {
  return wanted.start.line <= line.end.line && line.start.line <= wanted.end.line;
}

}  // namespace

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
