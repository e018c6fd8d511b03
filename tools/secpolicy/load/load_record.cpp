#include "load/load_record.h"

#include <ctime>
#include <exception>
#include <filesystem>

#include "host/linux/operation/load_record.h"
#include "installed/origin_reader.h"
#include "secpolicy/policy_root.h"
#include "summary.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

std::string Join(const std::string& root, const char* directory) { return root + "/" + directory; }

void ReadEarlyPolicy(const std::string& earlyDir, OriginReader& origins) {
  origins.ReadPaths(Join(earlyDir, SecPolicy::kDomainsDir), "", LinuxHost::LoadKind::kEarly);
  origins.ReadFileLabels(Join(SecPolicy::kPolicyRoot, SecPolicy::kFileLabelsDir));
}

void ReadPolicy(const std::string& dir, OriginReader& origins) {
  origins.ReadPaths(Join(dir, SecPolicy::kDomainsDir), "", LinuxHost::LoadKind::kFull);
  origins.ReadPaths(SecPolicy::kPartnerDomainsDir, SecPolicy::kPartnerPrefix,
                    LinuxHost::LoadKind::kFull);
  origins.ReadTardisks(Join(SecPolicy::kPolicyRoot, SecPolicy::kTardisksDir));
  origins.ReadFileLabels(Join(dir, SecPolicy::kFileLabelsDir));
}

// Reads the files that the verb loads, in its order.
void RecordOrigins(const std::string& verb, const std::string& dir) {
  SecPolicy::TeskAccessInterfaceImpl access;
  OriginReader origins(access);
  if (verb == kBoot.name) ReadEarlyPolicy(SecPolicy::kEarlyPolicyRoot, origins);
  if (verb == kLoadEarly.name) {
    ReadEarlyPolicy(dir, origins);
  } else {
    ReadPolicy(dir, origins);
  }
  for (const auto& [kind, domain, lines] : origins.AllPaths()) {
    LinuxHost::RecordPathLines(kind, domain, lines);
  }
  LinuxHost::RecordOrigins(origins.Rules(), origins.Labels());
}

void Record(const RecordedLoad& load, const std::string& directory,
            const LinuxHost::LoadRemainder& removed) {
  LinuxHost::RecordLoad({.verb = load.verb,
                         .directory = directory,
                         .time = std::time(nullptr),
                         .ending = load.ending,
                         .errorCount = load.errors.size(),
                         .errors = load.errors,
                         .removedRules = removed.rules,
                         .removedDomains = removed.domains.size()});
}

}  // namespace

std::string CanonicalName(const std::string& dir) {
  const std::filesystem::path path = std::filesystem::absolute(dir);
  const std::filesystem::path name = (path / ".").lexically_normal().parent_path();
  std::error_code ignored;
  // ".." behind a link leads elsewhere than its name says.
  return std::filesystem::equivalent(name, path, ignored) ? name : path;
}

void RecordLoad(const RecordedLoad& load, const LinuxHost::LoadEnding& ending) {
  try {
    const std::string directory = CanonicalName(load.policyDir);
    Record(load, directory, ending.removed);
    RecordOrigins(load.verb, directory);
  } catch (const std::exception& failure) {
    if (load.ending != "done") return;
    Summarize(load.verb,
              std::string("this load cannot be recorded for the verbs that explain it: ") +
                  failure.what());
  }
}

void RecordEnding(const RecordedLoad& load) { Record(load, CanonicalName(load.policyDir), {}); }

void RecordRollback(const std::string& name) {
  try {
    Record({.verb = kRollback.name, .policyDir = {}, .ending = "done", .errors = {}}, name, {});
  } catch (const std::exception& failure) {
    Summarize(kRollback.name,
              std::string("this rollback cannot be recorded for 'status': ") + failure.what());
  }
}

}  // namespace SecPolicyCli
