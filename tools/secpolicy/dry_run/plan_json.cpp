#include "load_plan.h"

namespace SecPolicyCli {
namespace {

using Policy::Difference;
using Policy::DomainDifference;

Json RulesOf(const Difference& difference, std::vector<Policy::Rule> DomainDifference::*rules) {
  Json list = Json::Array();
  for (const DomainDifference& domain : difference.domains) {
    for (const Policy::Rule& rule : domain.*rules) {
      list.Append({{"domain", domain.name}, {"rule", rule.Text()}});
    }
  }
  return list;
}

Json ChangesOf(const Difference& difference) {
  Json list = Json::Array();
  for (const DomainDifference& domain : difference.domains) {
    for (const auto& [before, after] : domain.changed) {
      list.Append({{"domain", domain.name}, {"before", before.Text()}, {"after", after.Text()}});
    }
  }
  return list;
}

Json NewDomains(const Difference& difference) {
  Json list = Json::Array();
  for (const DomainDifference& domain : difference.domains) {
    if (domain.IsNew()) list.Append(domain.name);
  }
  return list;
}

Json GoneDomains(const Difference& difference) {
  Json list = Json::Array();
  for (const DomainDifference& domain : difference.domains) {
    if (domain.IsGone()) list.Append(domain.name);
  }
  return list;
}

Json StayingRules(const LoadPlan& plan) {
  Json list = Json::Array();
  for (const auto& [domain, rule] : plan.stayingRules) {
    list.Append({{"domain", domain}, {"rule", rule.Text()}});
  }
  return list;
}

Json Labels(const LoadPlan& plan) {
  Json list = Json::Array();
  for (const auto& [path, before, after] : plan.labels) {
    list.Append({{"path", path}, {"before", before}, {"after", after}});
  }
  return list;
}

const char* WordFor(ExitCode ending) {
  if (ending == kWell) return "done";
  return ending == kStopped ? "stopped" : "failed";
}

}  // namespace

void WritePlanJson(const LoadPlan& plan, const std::string& policyDir, const Json& bundle,
                   const LoadDryRun& dryRun, std::ostream& output) {
  const Difference& difference = plan.difference;
  Json document = {
      {"schema", "secpolicy.plan/1"},
      {"directory", policyDir},
      {"ending", WordFor(dryRun.Ending())},
      {"errors", dryRun.Errors()},
      {"changesNothing", plan.ChangesNothing()},
      {"domains",
       {{"create", NewDomains(difference)},
        {"remove", GoneDomains(difference)},
        {"stay", plan.stayingDomains}}},
      {"objects", {{"add", difference.objectsAdded}, {"remove", difference.objectsRemoved}}},
      {"rules",
       {{"add", RulesOf(difference, &DomainDifference::added)},
        {"change", ChangesOf(difference)},
        {"remove", RulesOf(difference, &DomainDifference::removed)},
        {"stay", StayingRules(plan)}}},
      {"labels", Labels(plan)},
  };
  if (!bundle.IsNull()) document["bundle"] = bundle;
  output << document.Text();
}

}  // namespace SecPolicyCli
