#include "policy_diff.h"

namespace SecPolicyCli {
namespace {

// Null where there is nothing on that side.
Json TextOrNull(const std::string& text) { return text.empty() ? Json() : Json(text); }

Json ToJson(const std::optional<Policy::Level>& level) {
  return level ? Json(TextOf(*level)) : Json();
}

Json ToJson(const std::vector<Policy::Rule>& rules) {
  Json list = Json::Array();
  for (const Policy::Rule& rule : rules) list.Append(rule.Text());
  return list;
}

Json ToJson(const Policy::DomainDifference& domain) {
  Json changed = Json::Array();
  for (const auto& [before, after] : domain.changed) {
    changed.Append({{"before", before.Text()}, {"after", after.Text()}});
  }
  return {{"name", domain.name},
          {"level", {{"before", ToJson(domain.levelBefore)}, {"after", ToJson(domain.levelAfter)}}},
          {"rules",
           {{"removed", ToJson(domain.removed)},
            {"added", ToJson(domain.added)},
            {"changed", changed}}}};
}

Json ToJson(const std::vector<LabelDifference>& labels) {
  Json list = Json::Array();
  for (const auto& [path, before, after] : labels) {
    list.Append({{"path", path}, {"before", TextOrNull(before)}, {"after", TextOrNull(after)}});
  }
  return list;
}

}  // namespace

Json DiffToJson(const Comparison& diff) {
  Json domains = Json::Array();
  for (const Policy::DomainDifference& domain : diff.difference.domains)
    domains.Append(ToJson(domain));
  return {
      {"schema", "secpolicy.diff/1"},
      {"before", diff.before},
      {"after", diff.after},
      {"same", diff.IsSame()},
      {"domains", domains},
      {"objects",
       {{"removed", diff.difference.objectsRemoved}, {"added", diff.difference.objectsAdded}}},
      {"labels", diff.labels ? ToJson(*diff.labels) : Json()},
  };
}

void WriteDiffJson(const Comparison& diff, std::ostream& output) {
  output << DiffToJson(diff).Text();
}

}  // namespace SecPolicyCli
