#include <algorithm>
#include <map>
#include <optional>

#include "cursor.h"
#include "diagnostics.h"
#include "edit.h"
#include "features.h"
#include "mentions.h"
#include "protocol.h"

namespace SecPolicyCli {
namespace {

// What mends one problem.
struct Fix {
  std::string title;
  std::string path;
  Span span;
  std::string text;
};

// The whole line, with the line feed behind it or, of the last one, before it.
Span WholeLine(const TextDocument& text, std::size_t number) {
  Span span = text.LineSpan(number);
  if (span.end < text.Text().size()) {
    ++span.end;
  } else if (span.begin > 0) {
    --span.begin;
  }
  return span;
}

// A line behind the last.
Fix AppendLine(const std::string& title, const std::string& path, const TextDocument& text,
               const std::string& line) {
  const std::size_t end = text.Text().size();
  const bool isOpen = end > 0 && !text.Text().ends_with('\n');
  return {title, path, {end, end}, (isOpen ? "\n" : "") + line + "\n"};
}

bool IsOneOf(const Code* code, std::initializer_list<const Code*> codes) {
  return std::ranges::find(codes, code) != codes.end();
}

class Fixes {
 public:
  Fixes(const Workspace& files, LivePolicy& livePolicy, std::string file,
        const TextDocument& content)
      : workspace(files), policy(livePolicy), path(std::move(file)), text(content) {}

  std::vector<Fix> For(const Diagnostic& diagnostic) const {
    std::vector<Fix> fixes;
    const Code* const code = diagnostic.code;
    const Span span = SpanOf(diagnostic, text);
    const std::string& better = diagnostic.hint.replacement;
    if (!better.empty()) fixes.push_back({"Write '" + better + "' instead", path, span, better});
    if (code == &Codes::kTab) fixes.push_back({"Write a space instead", path, span, " "});
    if (code == &Codes::kByteOrderMark) fixes.push_back({"Remove the mark", path, span, ""});
    if (IsOneOf(code, {&Codes::kDuplicateRule, &Codes::kDuplicateObject, &Codes::kUnusedObject})) {
      fixes.push_back({"Remove this line", path, WholeLine(text, diagnostic.line), ""});
    }
    if (code == &Codes::kCannotStart) {
      fixes.push_back(
          AppendLine("Grant what every program needs to start", path, text, "-s @start grant"));
    }
    if (code == &Codes::kUnknownWord) {
      if (const auto fix = Declare(diagnostic.line, span)) fixes.push_back(*fix);
    }
    return fixes;
  }

 private:
  // An unknown label can be declared.
  std::optional<Fix> Declare(std::size_t line, Span span) const {
    const auto role = workspace.RoleOf(path);
    const std::size_t begin = text.LineSpan(line).begin;
    for (const PlacedWord& word : PlaceWords(*role, text.Line(line))) {
      if (word.span.begin + begin != span.begin || word.kind != Policy::WordKind::kLabel) continue;
      const auto files = policy.Files();
      const auto objects = std::ranges::find(files, FileRole::kObjectFile, &PolicyFile::role);
      if (objects == files.end()) return std::nullopt;
      const std::string& target = objects->source->Path();
      return AppendLine("Declare the object '" + word.text + "'", target, workspace.TextOf(target),
                        word.text);
    }
    return std::nullopt;
  }

  const Workspace& workspace;
  LivePolicy& policy;
  std::string path;
  const TextDocument& text;
};

bool Overlap(Range one, Range other) { return one.start <= other.end && other.start <= one.end; }

}  // namespace

Json FindFixes(Workspace& workspace, const Json& params) {
  const std::string path = PathOfDocument(params);
  const Range wanted = ReadRange(params.At("range"));
  LivePolicy* const policy = workspace.RoleOf(path) ? workspace.PolicyOf(path) : nullptr;
  if (policy == nullptr) return {};
  const TextDocument text = workspace.TextOf(path);
  const Fixes fixes(workspace, *policy, path, text);
  Json actions = Json::Array();
  for (const Diagnostic& diagnostic : policy->ProblemsOf(path)) {
    if (!Overlap(text.RangeOf(SpanOf(diagnostic, text)), wanted)) continue;
    for (const Fix& fix : fixes.For(diagnostic)) {
      WorkspaceEdit edit(workspace);
      edit.Replace(fix.path, workspace.TextOf(fix.path).RangeOf(fix.span), fix.text);
      Json mended = Json::Array();
      mended.Append(ToJson(diagnostic, text));
      actions.Append({{"title", fix.title},
                      {"kind", "quickfix"},
                      {"diagnostics", mended},
                      {"edit", edit.ToJson()}});
    }
  }
  return actions;
}

}  // namespace SecPolicyCli
