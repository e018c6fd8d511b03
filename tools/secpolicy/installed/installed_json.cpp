#include "installed_json.h"

#include "rule_words.h"

namespace SecPolicyCli {

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
  Json rules = Json::Array();
  for (const InstalledRule& rule : domain.rules) rules.Append(ToJson(rule));
  return {{"name", domain.name},
          {"id", domain.id},
          {"level", domain.level},
          {"state", domain.state},
          {"references", domain.references},
          {"worldReferences", domain.worldReferences},
          {"defaultRules", static_cast<int>(domain.defaultRules)},
          {"rules", rules}};
}

Json ToJson(const std::vector<InstalledTardisk>& tardisks) {
  Json list = Json::Array();
  for (const InstalledTardisk& tardisk : tardisks) {
    Json label;
    if (!tardisk.label.empty()) label = tardisk.label;
    list.Append({{"path", tardisk.path}, {"label", label}});
  }
  return list;
}

Json ToJson(const InstalledPolicy& policy) {
  Json domains = Json::Array();
  for (const InstalledDomain& domain : policy.domains) domains.Append(ToJson(domain));
  Json objects = Json::Array();
  for (const auto& [name, id] : policy.objects) objects.Append({{"name", name}, {"id", id}});
  return {{"domains", domains}, {"objects", objects}, {"tardisks", ToJson(policy.tardisks)}};
}

}  // namespace SecPolicyCli
