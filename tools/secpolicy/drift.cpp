#include "monitor/drift.h"

#include <algorithm>
#include <chrono>
#include <ctime>
#include <exception>
#include <iostream>
#include <optional>

#include "command_line.h"
#include "compare/policy_diff.h"
#include "ending.h"
#include "host/linux/operation/log_use.h"
#include "host/linux/operation/state_use.h"
#include "label/label_actions.h"
#include "monitor/journal.h"
#include "monitor/metrics.h"
#include "root.h"
#include "secpolicy/policy_root.h"
#include "text/format.h"
#include "text/replace_file.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Options {
  std::string policy = SecPolicy::kPolicyRoot;
  std::string metrics;
};

// A file that cannot be compared is told, and so are the others then.
LabelTally FindLabelDrift(const std::string& policy, bool& isWhole) {
  ErrorList errors;
  LabelRun run(errors, false);
  const LabelTally tally = CompareLabels(run, policy + "/" + SecPolicy::kFileLabelsDir, {});
  if (errors.Count() > 0) isWhole = false;
  return tally;
}

// Domains that services make while the host runs are no part of its policy.
Policy::Difference FindPolicyDrift(const std::string& policy) {
  const LinuxHost::DroppedLog dropped;
  SecPolicy::PolicyObserver nobody;
  Side written = ReadSide(policy, nobody);
  Side installed = ReadSide("installed", nobody);
  std::erase_if(installed.policy.domains, &Policy::InstalledDomain::IsCreatedAtRunTime);
  Comparison diff = Diff(std::move(written), std::move(installed));
  WriteDiffText(diff, std::cout);
  return std::move(diff.difference);
}

// One comparison that fails does not keep from the other.
template <class Step>
void Compare(bool& isWhole, Step step) {
  try {
    step();
  } catch (const std::exception& failure) {
    Summarize("drift", WithAdvice(failure.what()));
    isWhole = false;
  }
}

Drift FindDrift(const std::string& policy) {
  const auto begin = std::chrono::steady_clock::now();
  Drift drift;
  Compare(drift.isWhole, [&] { drift.labels = FindLabelDrift(policy, drift.isWhole); });
  Compare(drift.isWhole, [&] { drift.policy = FindPolicyDrift(policy); });
  drift.time = std::time(nullptr);
  drift.seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
  return drift;
}

void WriteMetrics(const Drift& drift, const std::string& file) {
  if (!file.empty()) ReplaceFile(file, MetricsOf(drift));
}

ExitCode End(const Drift& drift) {
  if (!drift.isWhole) {
    Summarize("drift", "not everything could be compared (above)");
    return kUsage;
  }
  if (!drift.IsThere()) {
    Summarize("drift", "none (" + CountOf(drift.labels.files, "file") +
                           ", and what is installed, are as the policy says)");
    return kWell;
  }
  const std::string text = Describe(drift) + " not as the policy says; nothing was changed";
  TellJournal(Event::kDrifted, text,
              {{"SECPOLICY_FILES", std::to_string(drift.labels.different)},
               {"SECPOLICY_DOMAINS", std::to_string(drift.policy.domains.size())},
               {"SECPOLICY_OBJECTS", std::to_string(drift.CountObjects())}});
  Summarize("drift", text);
  return kFailed;
}

ExitCode TellDrift(const Options& options) {
  if (LinuxHost::IsStateMissing()) {
    WriteMetrics({.isWhole = false, .time = std::time(nullptr)}, options.metrics);
    RefuseWithoutState("drift");
    return kUsage;
  }
  const Drift drift = FindDrift(options.policy);
  WriteMetrics(drift, options.metrics);
  return End(drift);
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax.AddOption("--policy", options->policy, "The policy directory, as seen from the root")
      .NameValue("DIR")
      .ShowDefault();
  syntax
      .AddOption("-o,--output", options->metrics,
                 "Put metrics of it into FILE, which others see whole, old or new")
      .NameValue("FILE");
  return [options] { return TellDrift(*options); };
}

}  // namespace

const Verb kDrift = {
    "drift", "Tell what is no longer as the policy says: labels of files, and what is installed",
    "Compares the label of every file that the policy names, as 'label verify' does, and what is\n"
    "installed, as 'diff' does with the policy directory, and prints each difference. Domains "
    "that\n"
    "services have made are left out. It repairs nothing: 'label relabel' and 'load' do. It looks\n"
    "at each of these files, so it takes as long as 'label verify'. Exit status: 0 no drift, 1\n"
    "drift, 2 not everything could be compared.\n"
    "\n"
    "Examples:\n"
    "  secpolicy drift\n"
    "  secpolicy drift --output /var/lib/prometheus/node-exporter/secpolicy-drift.prom",
    Define};

}  // namespace SecPolicyCli
