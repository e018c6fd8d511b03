#include "refused_act.h"

#include <ctime>
#include <string_view>

#include "json_reader.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

std::string JoinedBySpaces(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += (text.empty() ? "" : " ") + word;
  return text;
}

std::string WhoText(const RefusedProcess& process) {
  const std::string& name = process.path.empty() ? process.program : process.path;
  return name + ", process " + std::to_string(process.id) + " of user " +
         std::to_string(process.user);
}

Json TextOrNull(const std::string& text) { return text.empty() ? Json() : Json(text); }

Json ToJson(const RefusedProcess& process) {
  return {{"id", process.id},           {"user", process.user},
          {"program", process.program}, {"path", TextOrNull(process.path)},
          {"parent", process.parent},   {"parentPath", TextOrNull(process.parentProgram)}};
}

std::string TextAt(const Json& json, const char* name) {
  const std::string* const text = json.At(name).String();
  return text == nullptr ? "" : *text;
}

std::int64_t NumberAt(const Json& json, const char* name) {
  return json.At(name).Number().value_or(0);
}

// What IsoTime() has written; 0 for anything else.
std::int64_t ReadIsoTime(const std::string& text) {
  tm parts = {};
  const char* const end = strptime(text.c_str(), "%Y-%m-%dT%H:%M:%SZ", &parts);
  return end == nullptr || *end != '\0' ? 0 : timegm(&parts);
}

std::vector<std::string> TextsAt(const Json& json, const char* name) {
  std::vector<std::string> texts;
  for (const Json& element : json.At(name).Elements()) {
    if (element.String() != nullptr) texts.push_back(*element.String());
  }
  return texts;
}

RefusedProcess ReadProcess(const Json& json) {
  return {.id = NumberAt(json, "id"),
          .parent = NumberAt(json, "parent"),
          .user = NumberAt(json, "user"),
          .program = TextAt(json, "program"),
          .path = TextAt(json, "path"),
          .parentProgram = TextAt(json, "parentPath")};
}

}  // namespace

std::string ActOf(const RefusedAct& refused) {
  return refused.question.empty() ? refused.act : JoinedBySpaces(refused.question);
}

std::string TextOf(const RefusedAct& refused) {
  const std::string verdict = refused.isRefused ? " was refused: " : " would be refused: ";
  const std::string times =
      refused.count == 1 ? "" : ", " + std::to_string(refused.count) + " times";
  return refused.domain + verdict + ActOf(refused) + ", by " + WhoText(refused.process) + times;
}

Json ToJson(const RefusedAct& refused) {
  return {{"time", IsoTime(refused.time)},      {"count", refused.count},
          {"domain", refused.domain},           {"refused", refused.isRefused},
          {"ofNoRule", refused.isOfNoRule},     {"act", ActOf(refused)},
          {"asked", refused.question},          {"path", TextOrNull(refused.path)},
          {"label", TextOrNull(refused.label)}, {"process", ToJson(refused.process)}};
}

std::optional<RefusedAct> ReadRefusedAct(const Json& json) {
  RefusedAct refused = {.time = ReadIsoTime(TextAt(json, "time")),
                        .count = NumberAt(json, "count"),
                        .domain = TextAt(json, "domain"),
                        .isRefused = json.At("refused").Truth().value_or(true),
                        .isOfNoRule = json.At("ofNoRule").Truth().value_or(false),
                        .question = TextsAt(json, "asked"),
                        .act = TextAt(json, "act"),
                        .path = TextAt(json, "path"),
                        .label = TextAt(json, "label"),
                        .process = ReadProcess(json.At("process"))};
  if (refused.domain.empty() || ActOf(refused).empty()) return std::nullopt;
  return refused;
}

std::optional<RefusedAct> FindLatest(const std::string& lines, const std::string& domain) {
  std::string_view rest = lines;
  while (!rest.empty()) {
    if (rest.ends_with('\n')) rest.remove_suffix(1);
    const std::size_t before = rest.rfind('\n');
    const std::string_view line = before == std::string_view::npos ? rest : rest.substr(before + 1);
    rest.remove_suffix(line.size());
    const auto json = ReadJson(line);
    if (!std::holds_alternative<Json>(json)) continue;
    auto refused = ReadRefusedAct(std::get<Json>(json));
    if (refused && (domain.empty() || refused->domain == domain)) return refused;
  }
  return std::nullopt;
}

}  // namespace SecPolicyCli
