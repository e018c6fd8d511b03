#include "load/load_record.h"

#include <ctime>
#include <exception>
#include <filesystem>

#include "ending.h"
#include "host/linux/operation/load_record.h"
#include "host/linux/operation/state_use.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

void Record(const RecordedLoad& load, const std::string& directory,
            const LinuxHost::LoadRemainder& removed) {
  LinuxHost::RecordLoad(LinuxHost::CurrentState(), {.verb = load.verb,
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

void RecordLoad(const RecordedLoad& load, const LinuxHost::LoadEnding& ending,
                const LoadListener& listener) {
  try {
    const std::string directory = CanonicalName(load.policyDir);
    Record(load, directory, ending.removed);
    LinuxHost::RecordOrigins(LinuxHost::CurrentState(), listener.Rules(), listener.Labels());
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
