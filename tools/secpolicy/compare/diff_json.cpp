#include "json.h"
#include "policy_diff.h"

namespace SecPolicyCli {
namespace {

// Null where there is nothing on that side.
Json TextOrNull(const std::string& text) { return text.empty() ? Json() : Json(text); }

Json ToJson(const DomainDifference& domain) {
  Json changed = Json::Array();
  for (const auto& [before, after] : domain.changed) {
    changed.Append({{"before", before}, {"after", after}});
  }
  return {{"name", domain.name},
          {"level",
           {{"before", TextOrNull(domain.levelBefore)}, {"after", TextOrNull(domain.levelAfter)}}},
          {"rules", {{"removed", domain.removed}, {"added", domain.added}, {"changed", changed}}}};
}

Json ToJson(const std::vector<LabelDifference>& labels) {
  Json list = Json::Array();
  for (const auto& [path, before, after] : labels) {
    list.Append({{"path", path}, {"before", TextOrNull(before)}, {"after", TextOrNull(after)}});
  }
  return list;
}

}  // namespace

void WriteDiffJson(const PolicyDiff& diff, std::ostream& output) {
  Json domains = Json::Array();
  for (const DomainDifference& domain : diff.difference.domains) domains.Append(ToJson(domain));
  const Json document = {
      {"schema", "secpolicy.diff/1"},
      {"before", diff.before},
      {"after", diff.after},
      {"same", diff.IsSame()},
      {"domains", domains},
      {"objects",
       {{"removed", diff.difference.objectsRemoved}, {"added", diff.difference.objectsAdded}}},
      {"labels", diff.labels ? ToJson(*diff.labels) : Json()},
  };
  output << document.Text();
}

}  // namespace SecPolicyCli
