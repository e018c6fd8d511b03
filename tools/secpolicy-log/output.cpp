#include "output.h"

#include <ctime>
#include <iostream>

#include "braxo/lib/exception.h"
#include "host/linux/operation/latest_refusals.h"
#include "monitor/journal.h"
#include "text/format.h"
#include "text/visible.h"

namespace SecPolicyLog {
namespace {

using SecPolicyCli::Event;
using SecPolicyCli::Json;
using SecPolicyCli::RefusedAct;

constexpr std::size_t kLatest = 256;

std::string TextOf(const ExplainedRefusal& refusal) {
  const std::string behind = refusal.reason.empty() ? "" : "; " + refusal.reason;
  return SecPolicyCli::TextOf(refusal.refused) + behind;
}

Json ToJson(const ExplainedRefusal& refusal) {
  Json json = {{"schema", "secpolicy.refusal/1"}};
  json.Add(SecPolicyCli::ToJson(refusal.refused));
  json["answer"] = refusal.answer;
  return json;
}

// A field without a value is left out.
LinuxHost::JournalFields FieldsOf(const ExplainedRefusal& refusal) {
  const RefusedAct& refused = refusal.refused;
  LinuxHost::JournalFields fields = {
      {"SECPOLICY_DOMAIN", refused.domain},
      {"SECPOLICY_QUESTION", SecPolicyCli::ActOf(refused)},
      {"SECPOLICY_LEVEL", refused.isRefused ? "enforcing" : "permissive"},
      {"SECPOLICY_COUNT", std::to_string(refused.count)},
      {"SECPOLICY_PROCESS", std::to_string(refused.process.id)},
      {"SECPOLICY_PROGRAM",
       refused.process.path.empty() ? refused.process.program : refused.process.path},
      {"SECPOLICY_PARENT", std::to_string(refused.process.parent)},
      {"SECPOLICY_PARENT_PROGRAM", refused.process.parentProgram},
      {"SECPOLICY_USER", std::to_string(refused.process.user)},
      {"SECPOLICY_PATH", refused.path},
      {"SECPOLICY_LABEL", refused.label},
      {"SECPOLICY_FILE", refusal.file},
      {"SECPOLICY_LINE", refusal.line == 0 ? "" : std::to_string(refusal.line)},
      {"SECPOLICY_REASON", refusal.reason}};
  std::erase_if(fields, [](const auto& field) { return field.second.empty(); });
  return fields;
}

}  // namespace

Output::Output(bool json) : isJson(json) {
  const std::string lines = LinuxHost::ReadLatestRefusals().value_or("");
  for (std::size_t begin = 0; begin < lines.size();) {
    const std::size_t end = lines.find('\n', begin);
    latest.push_back(lines.substr(begin, end - begin));
    begin = end == std::string::npos ? lines.size() : end + 1;
  }
}

void Output::Tell(const ExplainedRefusal& refusal) {
  const std::string line = ToJson(refusal).Line();
  if (isJson) {
    std::cout << line << '\n';
  } else {
    std::cout << SecPolicyCli::IsoTime(refusal.refused.time) << ' '
              << SecPolicyCli::Visible(TextOf(refusal)) << '\n';
  }
  const Event event = refusal.refused.isRefused ? Event::kRefused : Event::kWouldBeRefused;
  SecPolicyCli::TellJournal(event, TextOf(refusal), FieldsOf(refusal));
  latest.push_back(line);
  if (latest.size() > kLatest) latest.pop_front();
  isNoted = false;
}

void Output::TellUntold(const std::string& domain, std::uint64_t count) {
  const std::string text = domain + ": " + SecPolicyCli::CountOf(count, "more refusal") +
                           " at a time when there were too many to tell of each";
  if (isJson) {
    const Json json = {{"schema", "secpolicy.refusals-untold/1"},
                       {"time", SecPolicyCli::IsoTime(time(nullptr))},
                       {"domain", domain},
                       {"count", count}};
    std::cout << json.Line() << '\n';
  } else {
    std::cout << SecPolicyCli::IsoTime(time(nullptr)) << ' ' << SecPolicyCli::Visible(text) << '\n';
  }
  SecPolicyCli::TellJournal(
      Event::kUntold, text,
      {{"SECPOLICY_DOMAIN", domain}, {"SECPOLICY_COUNT", std::to_string(count)}});
}

void Output::Flush() {
  std::cout.flush();
  if (!std::cout.good()) throw Braxo::Lib::BraxoException("standard output could not be written");
  if (isNoted) return;
  std::string text;
  for (const std::string& line : latest) text += line + '\n';
  LinuxHost::WriteLatestRefusals(text);
  isNoted = true;
}

}  // namespace SecPolicyLog
