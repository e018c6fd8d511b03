#include "diagnostics.h"

#include <string_view>

#include "protocol.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// Where so many characters of the text end; a byte that belongs to none counts as one.
std::size_t SizeOf(std::string_view text, std::size_t characters) {
  std::string_view rest = text;
  for (; characters > 0 && !rest.empty(); --characters) TakeCharacter(rest);
  return text.size() - rest.size();
}

int SeverityOf(const Diagnostic& diagnostic) {
  constexpr int kErrorNumber = 1;
  constexpr int kWarningNumber = 2;
  return diagnostic.code->severity == Severity::kError ? kErrorNumber : kWarningNumber;
}

}  // namespace

Span SpanOf(const Diagnostic& diagnostic, const TextDocument& text) {
  if (diagnostic.line == 0) return {0, 0};
  const Span line = text.LineSpan(diagnostic.line);
  const std::string_view rest = text.Line(diagnostic.line);
  const std::size_t begin = SizeOf(rest, diagnostic.column - 1);
  const std::size_t end = begin + SizeOf(rest.substr(begin), diagnostic.length);
  return {line.begin + begin, line.begin + end};
}

Json ToJson(const Diagnostic& diagnostic, const TextDocument& text) {
  const std::string& hint = diagnostic.hint.text;
  return {{"range", ToJson(text.RangeOf(SpanOf(diagnostic, text)))},
          {"severity", SeverityOf(diagnostic)},
          {"code", diagnostic.code->name},
          {"source", "secpolicy"},
          {"message", hint.empty() ? diagnostic.message : diagnostic.message + "\n" + hint}};
}

void DiagnosticPublisher::Update(Workspace& workspace, const Publish& publish) {
  LivePolicy* const policy = workspace.Policy();
  if (policy == nullptr) return;
  policy->Check();
  for (const std::string& file : policy->TakeChanged()) {
    const TextDocument text = workspace.TextOf(file);
    Json problems = Json::Array();
    for (const Diagnostic& diagnostic : policy->ProblemsOf(file)) {
      problems.Append(ToJson(diagnostic, text));
    }
    const std::string uri = workspace.UriOf(file);
    const auto [earlier, isNew] = published.try_emplace(uri, Json::Array());
    if (earlier->second == problems && !isNew) continue;
    earlier->second = problems;
    Json params = {{"uri", uri}, {"diagnostics", problems}};
    const OpenDocument* const document = workspace.Find(file);
    if (document != nullptr && document->version) params["version"] = *document->version;
    publish(params);
  }
}

}  // namespace SecPolicyCli
