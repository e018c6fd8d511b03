#include "installed_json.h"

#include "rule_words.h"

namespace SecPolicyCli {

using Json = nlohmann::ordered_json;

Json ToJson(const InstalledRule& rule) {
  const RuleWords words = SplitRule(rule.text);
  Json json = {{"text", rule.text}, {"keyword", words.keyword}, {"words", words.words}};
  if (words.grant) json["grant"] = *words.grant;
  if (!rule.origin.file.empty()) {
    json["file"] = rule.origin.file;
    json["line"] = rule.origin.line;
  }
  return json;
}

Json ToJson(const InstalledDomain& domain) {
  Json rules = Json::array();
  for (const InstalledRule& rule : domain.rules) rules.push_back(ToJson(rule));
  return {{"name", domain.name},
          {"id", domain.id},
          {"level", domain.level},
          {"state", domain.state},
          {"references", domain.references},
          {"worldReferences", domain.worldReferences},
          {"defaultRules", static_cast<int>(domain.defaultRules)},
          {"rules", rules}};
}

Json ToJson(const InstalledPolicy& policy) {
  Json domains = Json::array();
  for (const InstalledDomain& domain : policy.domains) domains.push_back(ToJson(domain));
  Json objects = Json::array();
  for (const auto& [name, id] : policy.objects) objects.push_back({{"name", name}, {"id", id}});
  Json tardisks = Json::array();
  for (const InstalledTardisk& tardisk : policy.tardisks) {
    Json label;
    if (!tardisk.label.empty()) label = tardisk.label;
    tardisks.push_back({{"path", tardisk.path}, {"label", label}});
  }
  return {{"domains", domains}, {"objects", objects}, {"tardisks", tardisks}};
}

std::string DumpJson(const Json& json) {
  return json.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

}  // namespace SecPolicyCli
