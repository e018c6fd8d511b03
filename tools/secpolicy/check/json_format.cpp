#include <nlohmann/json.hpp>

#include "installed/installed_json.h"
#include "report_format.h"

namespace SecPolicyCli {
namespace {

using Json = nlohmann::ordered_json;

Json ToJson(const Diagnostic& diagnostic) {
  Json json = {{"file", diagnostic.file}};
  if (diagnostic.line > 0) {
    json["line"] = diagnostic.line;
    json["column"] = diagnostic.column;
    json["length"] = diagnostic.length;
    json["source"] = diagnostic.source;
  }
  json["severity"] = SeverityName(diagnostic.code->severity);
  json["code"] = diagnostic.code->name;
  json["message"] = diagnostic.message;
  if (!diagnostic.hint.empty()) json["hint"] = diagnostic.hint;
  return json;
}

}  // namespace

void WriteJson(const DiagnosticList& diagnostics, std::ostream& output) {
  Json problems = Json::array();
  for (const Diagnostic& diagnostic : diagnostics.All()) problems.push_back(ToJson(diagnostic));
  const Json report = {{"schema", "secpolicy.check/1"},
                       {"errors", diagnostics.Count(Severity::kError)},
                       {"warnings", diagnostics.Count(Severity::kWarning)},
                       {"problems", problems}};
  // Bytes of a policy file that are no text are replaced, not refused.
  output << DumpJson(report);
}

}  // namespace SecPolicyCli
