#include "load_record.h"

#include <ctime>
#include <exception>
#include <filesystem>
#include <iostream>

#include "host/linux/load_record.h"
#include "installed/origin_reader.h"
#include "secpolicy/policy_root.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

std::string Join(const std::string& root, const char* directory) { return root + "/" + directory; }

void ReadEarlyPolicy(const std::string& earlyDir, OriginReader& origins) {
  origins.ReadDomains(Join(earlyDir, SecPolicy::kDomainsDir), "");
  origins.ReadFileLabels(Join(SecPolicy::kPolicyRoot, SecPolicy::kFileLabelsDir));
}

void ReadPolicy(const std::string& dir, OriginReader& origins) {
  origins.ReadDomains(Join(dir, SecPolicy::kDomainsDir), "");
  origins.ReadDomains(SecPolicy::kPartnerDomainsDir, SecPolicy::kPartnerPrefix);
  origins.ReadTardisks(Join(SecPolicy::kPolicyRoot, SecPolicy::kTardisksDir));
  origins.ReadFileLabels(Join(dir, SecPolicy::kFileLabelsDir));
}

// The directory under a name that means the same from everywhere and does not vary with the way it
// was typed.
std::string CanonicalName(const std::string& dir) {
  const std::filesystem::path path = std::filesystem::absolute(dir);
  const std::filesystem::path name = (path / ".").lexically_normal().parent_path();
  std::error_code ignored;
  // ".." behind a link leads elsewhere than its name says.
  return std::filesystem::equivalent(name, path, ignored) ? name : path;
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
  LinuxHost::RecordOrigins(origins.Rules(), origins.Labels());
}

void RecordEnding(const std::string& verb, const std::string& source, const std::string& ending,
                  const std::vector<std::string>& errors) {
  LinuxHost::RecordLoad({.verb = verb,
                         .directory = source,
                         .time = std::time(nullptr),
                         .ending = ending,
                         .errorCount = errors.size(),
                         .errors = errors});
}

}  // namespace

void RecordLoad(const std::string& verb, const std::string& policyDir, const std::string& ending,
                const std::vector<std::string>& errors) {
  try {
    const std::string dir = CanonicalName(policyDir);
    RecordEnding(verb, dir, ending, errors);
    RecordOrigins(verb, dir);
  } catch (const std::exception& failure) {
    if (ending != "done") return;
    std::cerr << "secpolicy: " << verb << ": this load cannot be recorded for the verbs that "
              << "explain it: " << Visible(failure.what()) << std::endl;
  }
}

void RecordRollback(const std::string& name) {
  try {
    RecordEnding(kRollback.name, name, "done", {});
  } catch (const std::exception& failure) {
    std::cerr << "secpolicy: " << kRollback.name << ": this rollback cannot be recorded for "
              << "'status': " << Visible(failure.what()) << std::endl;
  }
}

}  // namespace SecPolicyCli
