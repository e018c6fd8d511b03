#include <algorithm>

#include "json.h"
#include "report_format.h"
#include "root.h"
#include "text/uri.h"

namespace SecPolicyCli {
namespace {

// The form of identifiers of the OASIS standard, by which readers know it.
constexpr char kSchema[] =
    "https://docs.oasis-open.org/sarif/sarif/v2.1.0/errata01/os/schemas/sarif-schema-2.1.0.json";
constexpr char kSarifVersion[] = "2.1.0";

Json OneOf(Json element) {
  Json list = Json::Array();
  list.Append(std::move(element));
  return list;
}

Json Rules() {
  Json rules = Json::Array();
  for (const Code* code : AllCodes()) {
    rules.Append({{"id", code->name},
                  {"shortDescription", {{"text", code->summary}}},
                  {"defaultConfiguration", {{"level", SeverityName(code->severity)}}}});
  }
  return rules;
}

Json Location(const Diagnostic& diagnostic) {
  Json physical = {{"artifactLocation", {{"uri", ToUri(OutsidePath(diagnostic.file))}}}};
  if (diagnostic.line > 0) {
    physical["region"] = {{"startLine", diagnostic.line},
                          {"startColumn", diagnostic.column},
                          {"endColumn", diagnostic.column + diagnostic.length},
                          {"snippet", {{"text", diagnostic.source}}}};
  }
  return {{"physicalLocation", physical}};
}

Json Result(const Diagnostic& diagnostic) {
  const auto codes = AllCodes();
  const std::string text = diagnostic.hint.text.empty()
                               ? diagnostic.message
                               : diagnostic.message + " (" + diagnostic.hint.text + ")";
  return {{"ruleId", diagnostic.code->name},
          {"ruleIndex", std::find(codes.begin(), codes.end(), diagnostic.code) - codes.begin()},
          {"level", SeverityName(diagnostic.code->severity)},
          {"message", {{"text", text}}},
          {"locations", OneOf(Location(diagnostic))}};
}

}  // namespace

void WriteSarif(const DiagnosticList& diagnostics, std::ostream& output) {
  Json results = Json::Array();
  for (const Diagnostic& diagnostic : diagnostics.Shown()) results.Append(Result(diagnostic));
  const Json driver = {{"name", "secpolicy"}, {"version", SECPOLICY_VERSION}, {"rules", Rules()}};
  const Json run = {
      {"tool", {{"driver", driver}}}, {"columnKind", "unicodeCodePoints"}, {"results", results}};
  const Json log = {{"$schema", kSchema}, {"version", kSarifVersion}, {"runs", OneOf(run)}};
  output << log.Text();
}

}  // namespace SecPolicyCli
