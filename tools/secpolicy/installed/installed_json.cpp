#include "installed_json.h"

namespace SecPolicyCli {

Json ToJson(const Policy::Rule& rule) {
  const auto words = rule.Words();
  std::vector<std::string> texts(words.begin(), words.end());
  const bool endsInGrant = FormOf(rule.kind).endsInGrant;
  if (!endsInGrant) texts.push_back(TextOf(rule.verdict));
  Json json = {{"text", rule.Text()}, {"keyword", FormOf(rule.kind).keyword}, {"words", texts}};
  if (endsInGrant) json["grant"] = rule.Grants();
  if (!rule.origin.file.empty()) {
    json["file"] = rule.origin.file;
    json["line"] = rule.origin.line;
  }
  return json;
}

Json FactsToJson(const Policy::InstalledDomain& domain) {
  return {{"name", domain.name},
          {"id", domain.id},
          {"level", TextOf(domain.level)},
          {"state", domain.state},
          {"references", domain.references},
          {"worldReferences", domain.worldReferences},
          {"defaultRules", static_cast<int>(domain.defaultRules)}};
}

Json ToJson(const Policy::InstalledDomain& domain) {
  Json rules = Json::Array();
  for (const Policy::Rule& rule : domain.rules) rules.Append(ToJson(rule));
  Json json = FactsToJson(domain);
  json["rules"] = rules;
  return json;
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

Json ToJson(const Policy::InstalledPolicy& policy) {
  Json domains = Json::Array();
  for (const Policy::InstalledDomain& domain : policy.domains) domains.Append(ToJson(domain));
  Json objects = Json::Array();
  for (const auto& [name, id] : policy.objects) objects.Append({{"name", name}, {"id", id}});
  return {{"domains", domains}, {"objects", objects}};
}

}  // namespace SecPolicyCli
