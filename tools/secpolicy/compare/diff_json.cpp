#include <nlohmann/json.hpp>

#include "installed/installed_json.h"
#include "policy_diff.h"

namespace SecPolicyCli {
namespace {

using Json = nlohmann::ordered_json;

// Null where there is nothing on that side.
Json TextOrNull(const std::string& text) { return text.empty() ? Json() : Json(text); }

Json ToJson(const DomainDifference& domain) {
  Json changed = Json::array();
  for (const auto& [before, after] : domain.changed) {
    changed.push_back({{"before", before}, {"after", after}});
  }
  return {{"name", domain.name},
          {"level",
           {{"before", TextOrNull(domain.levelBefore)}, {"after", TextOrNull(domain.levelAfter)}}},
          {"rules", {{"removed", domain.removed}, {"added", domain.added}, {"changed", changed}}}};
}

Json ToJson(const std::vector<LabelDifference>& labels) {
  Json list = Json::array();
  for (const auto& [path, before, after] : labels) {
    list.push_back({{"path", path}, {"before", TextOrNull(before)}, {"after", TextOrNull(after)}});
  }
  return list;
}

}  // namespace

void WriteDiffJson(const PolicyDiff& diff, std::ostream& output) {
  Json domains = Json::array();
  for (const DomainDifference& domain : diff.difference.domains) domains.push_back(ToJson(domain));
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
  // A path need not be text.
  output << DumpJson(document);
}

}  // namespace SecPolicyCli
