#include <algorithm>
#include <cerrno>

#include "secpolicy/parse/directory.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

// Runs `step` on the name of every regular file. Whatever else is there is reported as a directory
// and skipped.
template <class Step>
void ForEachRegularFile(Directory& directory, Step step) {
  while (const dirent* entry = directory.Next()) {
    const std::string name = entry->d_name;
    if (entry->d_type == DT_REG) {
      step(name);
    } else {
      SecpolicyError("Skipping directory " + name);
    }
  }
}

bool HasPolicy(const std::string& tardisk, const std::list<TardiskPolicy*>& policies) {
  return std::any_of(policies.begin(), policies.end(), [&](TardiskPolicy* policy) {
    return policy->GetBackingTardiskPath() == tardisk;
  });
}

// Adds the policy at `path` to `policies` and takes its tardisk off `tardisks`. A file that came
// from no tardisk, and a second policy for one, is reported and dropped.
void AddPolicy(const std::string& path, std::list<TardiskPolicy*>& policies,
               std::list<std::string>& tardisks) {
  auto policy = std::make_unique<TardiskPolicy>(path);
  const std::string tardisk = policy->GetBackingTardiskPath();
  if (tardisk.empty()) {
    SecpolicyError("No backing tardisk for policy file " + path);
    return;
  }
  if (HasPolicy(tardisk, policies)) {
    SecpolicyError("More than one exception specification for tardisk " + tardisk);
    SecpolicyError("Ignoring " + path);
    return;
  }
  policies.push_back(policy.get());
  static_cast<void>(policy.release());
  tardisks.remove(tardisk);
}

}  // namespace

void GetAllTardisks(std::list<std::string>& tardisks) {
  errno = 0;
  Directory images(kTardiskImagesDir);
  if (!images.IsOpen()) RaiseError(std::string("Could not open tardisk dir ") + kTardiskImagesDir);
  ForEachRegularFile(
      images, [&](const std::string& name) { tardisks.push_back(kTardiskImagesDir + name); });
}

void GetTardiskLists(const std::string& policyDir, std::list<TardiskPolicy*>& policies,
                     std::list<std::string>& unmatched) {
  std::list<std::string> tardisks;
  GetAllTardisks(tardisks);

  errno = 0;
  Directory directory(policyDir);
  if (!directory.IsOpen()) {
    // A host without tardisk policies leaves its tardisks alone, the default policy included.
    if (errno == ENOENT) {
      SecpolicyInfo("Skipping tardisk policy as " + policyDir + " does not exist");
      return;
    }
    RaiseError("Unable to open policy directory for tardisks " + policyDir);
  }
  ForEachRegularFile(directory, [&](const std::string& name) {
    AddPolicy(policyDir + "/" + name, policies, tardisks);
  });
  unmatched.splice(unmatched.end(), tardisks);
}

}  // namespace SecPolicy
