#include <algorithm>
#include <cerrno>

#include "secpolicy/carry_on.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/parse/directory.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"
#include "secpolicy/tardisk/tardisk_policy_steps.h"

namespace SecPolicy {
namespace {

// Runs `step` on the name of every regular file. Whatever else is there is reported as a directory
// and skipped.
template <class Step>
void ForEachRegularFile(Directory& directory, PolicyObserver& observer, Step step) {
  while (const dirent* entry = directory.Next()) {
    const std::string name = entry->d_name;
    if (entry->d_type == DT_REG) {
      step(name);
    } else {
      ReportError("Skipping directory " + name, observer);
    }
  }
}

bool HasPolicy(const std::string& tardisk, const std::list<TardiskPolicy*>& policies,
               PolicyObserver& observer) {
  return std::any_of(policies.begin(), policies.end(), [&](TardiskPolicy* policy) {
    return TardiskPolicySteps(*policy, observer).GetBackingTardiskPath() == tardisk;
  });
}

// Adds the policy at `path` to `policies` and takes its tardisk off `tardisks`. A file that came
// from no tardisk, and a second policy for one, is reported and dropped.
void AddPolicy(const std::string& path, std::list<TardiskPolicy*>& policies,
               std::list<std::string>& tardisks, PolicyObserver& observer) {
  auto policy = std::make_unique<TardiskPolicy>(path);
  const std::string tardisk = TardiskPolicySteps(*policy, observer).GetBackingTardiskPath();
  if (tardisk.empty()) return ReportWithoutTardisk(path, observer);
  if (HasPolicy(tardisk, policies, observer)) {
    const std::string reason = "More than one exception specification for tardisk " + tardisk;
    observer.OnProblem({.file = path, .reason = reason});
    ReportError(reason, observer);
    ReportError("Ignoring " + path, observer);
    return;
  }
  policies.push_back(policy.get());
  static_cast<void>(policy.release());
  tardisks.remove(tardisk);
}

}  // namespace

void GetAllTardisks(std::list<std::string>& tardisks) { GetAllTardisks(tardisks, Nobody()); }

void GetAllTardisks(std::list<std::string>& tardisks, PolicyObserver& observer) {
  errno = 0;
  Directory images(kTardiskImagesDir);
  if (!images.IsOpen()) RaiseError(std::string("Could not open tardisk dir ") + kTardiskImagesDir);
  ForEachRegularFile(images, observer, [&](const std::string& name) {
    tardisks.push_back(kTardiskImagesDir + name);
  });
}

void GetTardiskLists(const std::string& policyDir, std::list<TardiskPolicy*>& policies,
                     std::list<std::string>& unmatched) {
  GetTardiskLists(policyDir, policies, unmatched, Nobody());
}

void GetTardiskLists(const std::string& policyDir, std::list<TardiskPolicy*>& policies,
                     std::list<std::string>& unmatched, PolicyObserver& observer) {
  std::list<std::string> tardisks;
  GetAllTardisks(tardisks, observer);

  errno = 0;
  Directory directory(policyDir);
  if (!directory.IsOpen()) {
    // A host without tardisk policies leaves its tardisks alone, the default policy included.
    if (errno == ENOENT) {
      SecpolicyInfo("Skipping tardisk policy as " + policyDir + " does not exist");
      return;
    }
    TellFailure(policyDir, observer,
                [&] { RaiseError("Unable to open policy directory for tardisks " + policyDir); });
  }
  ForEachRegularFile(directory, observer, [&](const std::string& name) {
    AddPolicy(policyDir + "/" + name, policies, tardisks, observer);
  });
  unmatched.splice(unmatched.end(), tardisks);
}

}  // namespace SecPolicy
