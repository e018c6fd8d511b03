#include "drift.h"

#include <iterator>
#include <vector>

#include "monitor/metrics.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

Gauge Single(const char* name, const char* help, double value) {
  return {name, help, {{{}, value}}};
}

double CountRules(const Policy::Difference& difference) {
  std::size_t count = 0;
  for (const Policy::DomainDifference& domain : difference.domains) {
    count += domain.removed.size() + domain.added.size() + domain.changed.size();
  }
  return static_cast<double>(count);
}

std::vector<Gauge> Counts(const Drift& drift) {
  const std::size_t otherLabel = drift.labels.different - drift.labels.withoutLabel;
  return {
      Single("secpolicy_drift_checked_files", "Files whose label was compared.",
             static_cast<double>(drift.labels.files)),
      {"secpolicy_drift_files",
       "Those of them that have another label than the policy says, or none.",
       {{{{"has", "other_label"}}, static_cast<double>(otherLabel)},
        {{{"has", "no_label"}}, static_cast<double>(drift.labels.withoutLabel)}}},
      Single("secpolicy_drift_domains",
             "Domains that are installed otherwise than the policy says, or only there.",
             static_cast<double>(drift.policy.domains.size())),
      Single("secpolicy_drift_rules", "Rules in which these domains differ.",
             CountRules(drift.policy)),
      Single("secpolicy_drift_objects", "Object labels that only the policy has, or only the host.",
             static_cast<double>(drift.CountObjects()))};
}

}  // namespace

std::string Describe(const Drift& drift) {
  std::vector<std::string> parts;
  std::size_t count = 0;
  const auto add = [&](std::size_t number, const std::string& text) {
    if (number == 0) return;
    parts.push_back(text);
    count += number;
  };
  const std::size_t domains = drift.policy.domains.size();
  add(drift.labels.different,
      std::to_string(drift.labels.different) + " of " + CountOf(drift.labels.files, "file"));
  add(domains, CountOf(domains, "domain"));
  add(drift.CountObjects(), CountOf(drift.CountObjects(), "object"));
  return ListOf(parts, "and") + (count == 1 ? " is" : " are");
}

std::string MetricsOf(const Drift& drift) {
  std::vector<Gauge> gauges = {
      Single("secpolicy_drift_check_timestamp_seconds",
             "When the host was last compared with its policy, in seconds since 1970.",
             static_cast<double>(drift.time)),
      Single("secpolicy_drift_check_success",
             "1 when everything could be compared; without that there are no numbers.",
             drift.isWhole ? 1 : 0),
      Single("secpolicy_drift_check_duration_seconds", "How long that took.", drift.seconds)};
  if (drift.isWhole) {
    std::vector<Gauge> counts = Counts(drift);
    gauges.insert(gauges.end(), std::make_move_iterator(counts.begin()),
                  std::make_move_iterator(counts.end()));
  }
  return TextOf(gauges);
}

}  // namespace SecPolicyCli
