#include "json.h"
#include "report_format.h"
#include "root.h"

namespace SecPolicyCli {
namespace {

Json ToJson(const Diagnostic& diagnostic) {
  Json json = {{"file", OutsidePath(diagnostic.file)}};
  if (diagnostic.line > 0) {
    json["line"] = diagnostic.line;
    json["column"] = diagnostic.column;
    json["length"] = diagnostic.length;
    json["source"] = diagnostic.source;
  }
  json["severity"] = SeverityName(diagnostic.code->severity);
  json["code"] = diagnostic.code->name;
  json["message"] = diagnostic.message;
  if (!diagnostic.hint.text.empty()) json["hint"] = diagnostic.hint.text;
  return json;
}

}  // namespace

void WriteJson(const DiagnosticList& diagnostics, std::ostream& output) {
  Json problems = Json::Array();
  for (const Diagnostic& diagnostic : diagnostics.Shown()) problems.Append(ToJson(diagnostic));
  Json tally = Json::Object();
  for (const auto& [code, count] : diagnostics.Tally()) tally[code->name] = count;
  const Json report = {{"schema", "secpolicy.check/1"},
                       {"against", diagnostics.against},
                       {"errors", diagnostics.Count(Severity::kError)},
                       {"warnings", diagnostics.Count(Severity::kWarning)},
                       {"tally", tally},
                       {"problems", problems}};
  output << report.Text();
}

}  // namespace SecPolicyCli
