#include "status_metrics.h"

#include <algorithm>
#include <iterator>

#include "host/linux/operation/text_digest.h"
#include "monitor/metrics.h"

namespace SecPolicyCli {
namespace {

// What two hosts with the same policy have in common: neither numbers, levels and the order of
// installation, nor the domains that services have made meanwhile.
std::string DescribePolicy(const Policy::InstalledPolicy& policy) {
  std::vector<std::string> lines;
  for (const Policy::InstalledDomain& domain : policy.domains) {
    if (domain.IsCreatedAtRunTime()) continue;
    lines.push_back("domain " + domain.name);
    for (const Policy::Rule& rule : domain.rules) {
      lines.push_back("rule " + domain.name + " " + rule.Text());
    }
  }
  for (const auto& [name, id] : policy.objects) lines.push_back("object " + name);
  std::ranges::sort(lines);
  std::string text;
  for (const std::string& line : lines) text += line + '\n';
  return text;
}

std::vector<Gauge> HostGauges(bool isBooted, bool isReadable) {
  return {{"secpolicy_build_info",
           "The version of the secpolicy command.",
           {{{{"version", SECPOLICY_VERSION}}, 1}}},
          {"secpolicy_booted",
           "1 when this host has a state, which a boot makes.",
           {{{}, isBooted ? 1.0 : 0.0}}},
          {"secpolicy_state_readable",
           "1 when that state could be read.",
           {{{}, isReadable ? 1.0 : 0.0}}}};
}

Gauge LoadedGauge(bool isLoaded) {
  return {"secpolicy_policy_loaded",
          "1 when there are domains beside the one that is built in.",
          {{{}, isLoaded ? 1.0 : 0.0}}};
}

Gauge RuleGauge(const HostStatus& status) {
  Gauge gauge{"secpolicy_rules", "Installed rules of each kind.", {}};
  for (const Policy::RuleForm& form : Policy::kRuleForms) {
    const auto found = status.rulesByKind.find(form.kind);
    const std::size_t count = found == status.rulesByKind.end() ? 0 : found->second;
    gauge.samples.push_back({{{"kind", form.name}}, static_cast<double>(count)});
  }
  return gauge;
}

Gauge DomainGauge(const HostStatus& status) {
  Gauge gauge{"secpolicy_domains", "Installed domains at each enforcement level.", {}};
  for (const Policy::Level level : Policy::kLevels) {
    const auto found = status.domainsByLevel.find(level);
    const std::size_t count = found == status.domainsByLevel.end() ? 0 : found->second.size();
    gauge.samples.push_back({{{"level", TextOf(level)}}, static_cast<double>(count)});
  }
  return gauge;
}

// Nothing confines who was placed by a service.
Gauge WorldGauge(const HostStatus& status) {
  Gauge gauge{"secpolicy_worlds",
              "Living processes that were placed in a domain, by the level that they were entered "
              "with; 'placed' are those that a service has placed, which nothing confines.",
              {}};
  const auto add = [&](const char* name, std::optional<Policy::Level> level) {
    const auto count = std::ranges::count(status.worlds, level, &LinuxHost::PlacedWorld::level);
    gauge.samples.push_back({{{"level", name}}, static_cast<double>(count)});
  };
  for (const Policy::Level level : Policy::kLevels) add(TextOf(level), level);
  add("placed", std::nullopt);
  return gauge;
}

std::vector<Gauge> LoadGauges(const LinuxHost::LoadRecord& load) {
  Gauge outcome{"secpolicy_last_load_outcome",
                "1 for how the latest boot, load, load-early or rollback ended, 0 for the others.",
                {}};
  for (const char* const ending : {"done", "failed", "stopped"}) {
    outcome.samples.push_back({{{"outcome", ending}}, load.ending == ending ? 1.0 : 0.0});
  }
  return {{"secpolicy_last_load_timestamp_seconds",
           "When the latest boot, load, load-early or rollback ended, in seconds since 1970.",
           {{{}, static_cast<double>(load.time)}}},
          std::move(outcome),
          {"secpolicy_last_load_errors",
           "Errors that it reported.",
           {{{}, static_cast<double>(load.errorCount)}}},
          {"secpolicy_last_load_info", "What it was.", {{{{"verb", load.verb}}, 1}}}};
}

// Nothing where the policy comes from no bundle, or that cannot be told.
std::vector<Gauge> BundleGauges(const HostStatus& status) {
  if (!status.bundle || !status.bundle->bundle) return {};
  const auto& [manifest, digest, time] = *status.bundle->bundle;
  return {{"secpolicy_bundle_info",
           "The bundle that the policy files came from, with the SHA-256 of its manifest.",
           {{{{"name", manifest.name}, {"key", manifest.key}, {"digest", digest}}, 1}}},
          {"secpolicy_bundle_serial",
           "Its serial, which is greater in each bundle of a policy.",
           {{{}, static_cast<double>(manifest.serial)}}},
          {"secpolicy_bundle_installed",
           "1 when the latest load was one of these files, and ended well.",
           {{{}, status.bundle->isLoaded ? 1.0 : 0.0}}},
          {"secpolicy_bundle_edited_files",
           "Policy files that differ from those of the bundle.",
           {{{}, static_cast<double>(status.bundle->edits.size())}}}};
}

Gauge Count(const char* name, const char* help, std::size_t count) {
  return {name, help, {{{}, static_cast<double>(count)}}};
}

// Of the machine itself.
std::vector<Gauge> ModuleGauges(const ModuleStatus& module) {
  const KeptDomain all = SumOf(module.domains);
  return {
      Count("secpolicy_module_wanted", "1 when the kernel is to keep the policy for every process.",
            module.isWanted),
      Count("secpolicy_module_refusing", "1 when it refuses, which was tried.", module.isRefusing),
      Count("secpolicy_module_published", "1 when it was told all that is installed.",
            module.isPublished),
      Count("secpolicy_module_processes", "Processes that the kernel has in domains.",
            all.processes),
      {"secpolicy_module_refusals",
       "What the kernel has refused in domains since the module was started, or let pass in "
       "permissive ones.",
       {{{{"outcome", "refused"}}, static_cast<double>(all.refused)},
        {{{"outcome", "passed"}}, static_cast<double>(all.passed)}}}};
}

}  // namespace

std::string MetricsOf(const HostStatus& status) {
  std::vector<Gauge> gauges = HostGauges(true, true);
  gauges.push_back(LoadedGauge(status.IsLoaded()));
  gauges.push_back(
      {"secpolicy_policy_info",
       "The SHA-256 of the installed objects, domains and rules, the same on each host with the "
       "same policy.",
       {{{{"digest", LinuxHost::DigestOf(DescribePolicy(status.policy))}}, 1}}});
  if (status.load) std::ranges::move(LoadGauges(*status.load), std::back_inserter(gauges));
  std::ranges::move(BundleGauges(status), std::back_inserter(gauges));
  gauges.push_back(RuleGauge(status));
  gauges.push_back(DomainGauge(status));
  gauges.push_back(
      Count("secpolicy_objects", "Installed object labels.", status.policy.objects.size()));
  gauges.push_back(Count("secpolicy_tardisks", "Tardisks of the host.", status.tardisks.size()));
  gauges.push_back(WorldGauge(status));
  if (status.module) std::ranges::move(ModuleGauges(*status.module), std::back_inserter(gauges));
  gauges.push_back(
      Count("secpolicy_rules_without_file",
            "Rules that a load has installed, the latest has found in no file, and that stay.",
            status.rulesWithoutLine));
  gauges.push_back(
      Count("secpolicy_domains_without_file",
            "Domains that a load has installed, the latest has found in no file, and that stay.",
            status.domainsWithoutFile.size()));
  return TextOf(gauges);
}

std::string MetricsWithoutState() {
  std::vector<Gauge> gauges = HostGauges(false, false);
  gauges.push_back(LoadedGauge(false));
  return TextOf(gauges);
}

std::string MetricsWithoutStatus() { return TextOf(HostGauges(true, false)); }

}  // namespace SecPolicyCli
