#include "load/bundle_load.h"

#include <ctime>
#include <iostream>
#include <optional>

#include "bundle/bundle_decision.h"
#include "bundle/bundle_file.h"
#include "bundle/bundle_limits.h"
#include "bundle/installed_bundle.h"
#include "bundle/policy_exchange.h"
#include "bundle/trusted_keys.h"
#include "dry_run/load_dry_run.h"
#include "ending.h"
#include "host/linux/operation/state_use.h"
#include "host/linux/operation/text_digest.h"
#include "kitlibs/file.h"
#include "load/blocked_signals.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::kPolicyRoot;

// A bundle that was verified.
struct VerifiedBundle {
  explicit VerifiedBundle(const BundleChoice& choice)
      : file(choice.file), manifest(file.Verify(TrustedKeys(choice.keys), std::time(nullptr))) {}

  BundleFile file;
  Manifest manifest;
};

// What is in its way.
struct PolicyInPlace {
  bool isThere = File_IsDirectory(kPolicyRoot);
  std::optional<InstalledBundle> bundle = isThere ? ReadInstalledBundle(kPolicyRoot) : std::nullopt;
  std::vector<std::string> edits =
      bundle ? FindEdits(kPolicyRoot, bundle->manifest) : std::vector<std::string>();

  bool Is(const Manifest& manifest) const {
    return bundle && bundle->manifest == manifest && edits.empty();
  }
};

void RequireNewer(const PolicyInPlace& policy, const VerifiedBundle& offered,
                  const BundleChoice& choice) {
  if (!policy.bundle || choice.allowOlder) return;
  const std::string why = WhyNotNewer(policy.bundle->manifest, offered.manifest);
  if (!why.empty()) throw BadBundle(choice.file + ": " + why);
}

// What would be lost without a copy.
void TellEdits(const PolicyInPlace& policy, const std::string& outcome) {
  const std::string end = outcome + kPreviousPolicy;
  if (policy.isThere && !policy.bundle) {
    Summarize("load",
              std::string("the policy in ") + kPolicyRoot + " comes from no bundle. " + end);
  }
  if (!policy.edits.empty()) {
    Summarize("load", "the policy was edited since " + NameBundle(policy.bundle->manifest) +
                          ", was put in place: " + FirstOf(policy.edits) + ". " + end);
  }
}

void TellExchange(const PolicyInPlace& policy, const Manifest& manifest) {
  TellEdits(policy, "It is kept in ");
  const std::string previous =
      policy.isThere ? std::string("; ") + kPreviousPolicy + " has what was there before" : "";
  Summarize("load", NameBundle(manifest) + ", is in place" + previous);
}

void RequireTardiskPolicy(const VerifiedBundle& offered, const BundleChoice& choice) {
  const std::string file = FindForeignTardiskPolicy(kPolicyRoot, offered.manifest);
  if (file.empty()) return;
  throw BadBundle(
      choice.file + ": its " + file +
      " is not that of this host. Only a tardisk can bring it: sign the policy without.");
}

void RequireSuitable(const PolicyInPlace& policy, const VerifiedBundle& offered,
                     const BundleChoice& choice) {
  RequireNewer(policy, offered, choice);
  RequireTardiskPolicy(offered, choice);
}

// Beside the policy of tardisks, which stays what it is.
std::vector<ArchiveEntry> FilesToInstall(const VerifiedBundle& offered) {
  std::vector<ArchiveEntry> files = offered.file.Files();
  std::erase_if(files, [](const ArchiveEntry& file) { return IsTardiskPolicy(file.name); });
  files.push_back({kManifestName, offered.file.ManifestText()});
  files.push_back({kSignatureName, offered.file.Signature()});
  return files;
}

// On a copy: what cannot be loaded never comes to where the next boot would find it.
ExitCode Try(LoadRequest load, const std::vector<ArchiveEntry>& files) {
  load.unpack = [&](const std::string& directory) { WritePolicyTree(directory, files); };
  const LoadDryRun dryRun(load);
  if (dryRun.Ending() != kWell) std::cerr << dryRun.Messages() << std::flush;
  return dryRun.Ending();
}

ExitCode Exchange(PolicyExchange& exchange, const PolicyInPlace& policy,
                  const VerifiedBundle& offered, LoadRequest load) {
  const std::vector<ArchiveEntry> files = FilesToInstall(offered);
  const ExitCode trial = Try(load, files);
  if (trial != kWell) return trial;
  std::optional<BlockedSignals> blocked;
  load.begin = [&] {
    blocked.emplace();
    exchange.PutInPlace(files);
  };
  load.undo = [&] { exchange.PutBack(); };
  const ExitCode code = RunLoad(load);
  if (!exchange.IsInPlace()) return code;
  exchange.Finish();
  TellExchange(policy, offered.manifest);
  return code;
}

Json DescribeBundle(const VerifiedBundle& offered, const PolicyInPlace& policy) {
  return {{"name", offered.manifest.name},
          {"serial", offered.manifest.serial},
          {"key", offered.manifest.key},
          {"digest", LinuxHost::DigestOf(offered.file.ManifestText())},
          {"edited", policy.edits}};
}

}  // namespace

ExitCode LoadBundle(const BundleChoice& choice, LoadRequest load) {
  if (LinuxHost::IsStateMissing()) return RefuseWithoutState(load.verb);
  const VerifiedBundle offered(choice);
  PolicyExchange exchange;
  const PolicyInPlace policy;
  RequireSuitable(policy, offered, choice);
  load.allOrNothing = true;
  load.bundle = choice.file;
  if (policy.Is(offered.manifest)) return RunLoad(load);
  return Exchange(exchange, policy, offered, load);
}

ExitCode PlanBundle(const BundleChoice& choice, LoadRequest load, PlanOptions options) {
  if (LinuxHost::IsStateMissing()) return RefuseWithoutState(load.verb);
  const VerifiedBundle offered(choice);
  const PolicyInPlace policy;
  RequireSuitable(policy, offered, choice);
  TellEdits(policy, "It would be kept in ");
  load.allOrNothing = true;
  load.bundle = choice.file;
  const std::vector<ArchiveEntry> files = FilesToInstall(offered);
  load.unpack = [&](const std::string& directory) { WritePolicyTree(directory, files); };
  options.bundle = DescribeBundle(offered, policy);
  return PlanLoad(load, options);
}

}  // namespace SecPolicyCli
