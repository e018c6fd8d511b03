#include "load/load_record.h"

#include <ctime>
#include <exception>
#include <filesystem>
#include <optional>

#include "bundle/installed_bundle.h"
#include "ending.h"
#include "host/linux/operation/load_record.h"
#include "host/linux/operation/state_use.h"
#include "secpolicy/policy_root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

void Record(const RecordedLoad& load, const std::string& directory,
            const LinuxHost::LoadRemainder& removed) {
  LinuxHost::LoadRecord record{.verb = load.verb,
                               .directory = directory,
                               .time = std::time(nullptr),
                               .ending = load.ending,
                               .errors = load.errors,
                               .removedRules = removed.rules,
                               .removedDomains = removed.domains.size()};
  if (load.labelsFollow) {
    record.ending = "failed";
    record.errors.emplace_back(
        "Not all files have their labels: the load still gives them, or was killed");
  }
  record.errorCount = record.errors.size();
  LinuxHost::RecordLoad(LinuxHost::CurrentState(), record);
}

void TellUnrecorded(const RecordedLoad& load, const std::exception& failure) {
  if (load.ending != "done") return;
  Summarize(load.verb, std::string("this load cannot be recorded for the verbs that explain it: ") +
                           failure.what());
}

// The partner domains of any other directory are those of the host's own.
std::string DigestOfBundle(const std::string& dir) {
  if (CanonicalName(dir) != SecPolicy::kPolicyRoot) return "";
  const std::optional<InstalledBundle> bundle = ReadInstalledBundle(dir);
  return bundle ? bundle->digest : "";
}

}  // namespace

std::string CanonicalName(const std::string& dir) {
  const std::filesystem::path path = std::filesystem::absolute(dir);
  const std::filesystem::path name = (path / ".").lexically_normal().parent_path();
  std::error_code ignored;
  // ".." behind a link leads elsewhere than its name says.
  return std::filesystem::equivalent(name, path, ignored) ? name : path;
}

void RecordLoad(const RecordedLoad& load, const LinuxHost::LoadEnding& ending,
                const LoadListener& listener) {
  try {
    const std::string directory = CanonicalName(load.policyDir);
    Record(load, directory, ending.removed);
    LinuxHost::RecordOrigins(LinuxHost::CurrentState(), listener.Rules(), listener.Labels());
  } catch (const std::exception& failure) {
    TellUnrecorded(load, failure);
  }
}

void RecordLabelled(const RecordedLoad& load, const LinuxHost::LoadEnding& ending) {
  try {
    const auto latest = LinuxHost::LatestLoad(LinuxHost::CurrentState());
    const bool isThis = latest && latest->verb == load.verb && latest->ending == "failed" &&
                        latest->errorCount == load.errors.size() + 1;
    if (isThis) Record(load, CanonicalName(load.policyDir), ending.removed);
  } catch (const std::exception& failure) {
    TellUnrecorded(load, failure);
  }
}

void RecordInstalledPolicy(const std::string& dir, bool isWhole) {
  std::string digest;
  try {
    if (isWhole) digest = DigestOfBundle(dir);
  } catch (const std::exception&) {
    digest.clear();  // `status` tells what is wrong with the manifest
  }
  try {
    LinuxHost::RecordLoadedBundle(LinuxHost::CurrentState(), digest);
  } catch (const std::exception&) {
    return;
  }
}

void RecordEnding(const RecordedLoad& load) { Record(load, CanonicalName(load.policyDir), {}); }

void RecordRollback(const std::string& name) {
  try {
    LinuxHost::RecordLoadedBundle(LinuxHost::CurrentState(), "");
    Record({.verb = kRollback.name, .policyDir = {}, .ending = "done", .errors = {}}, name, {});
  } catch (const std::exception& failure) {
    Summarize(kRollback.name,
              std::string("this rollback cannot be recorded for 'status': ") + failure.what());
  }
}

}  // namespace SecPolicyCli
