#include "load_plan.h"

#include <iostream>
#include <map>
#include <sstream>

#include "compare/policy_directory.h"
#include "compare/tardisk_transitions.h"
#include "scratch/used_state.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::TeskAccessInterfaceImpl;

constexpr unsigned int kCreatedAtRunTime = 0x8;

// Keeps what is written to standard error from being seen.
class QuietErrors {
 public:
  QuietErrors() : shown(std::cerr.rdbuf(ignored.rdbuf())) {}
  QuietErrors(const QuietErrors&) = delete;
  QuietErrors& operator=(const QuietErrors&) = delete;
  ~QuietErrors() { std::cerr.rdbuf(shown); }

 private:
  std::ostringstream ignored;
  std::streambuf* shown;
};

InstalledPolicy ReadState(const std::string& path) {
  const LinuxHost::UsedState state(path);
  TeskAccessInterfaceImpl access;
  return ReadInstalledPolicy(access);
}

// The part of a state that policy files are to bring.
InstalledPolicy ReadFilePart(const std::string& path) {
  const LinuxHost::UsedState state(path);
  TeskAccessInterfaceImpl access;
  InstalledPolicy policy = ReadInstalledPolicy(access);
  DropTardiskTransitions(policy, access);
  std::erase_if(policy.domains, [](const InstalledDomain& domain) {
    return domain.defaultRules != TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE ||
           (domain.state & kCreatedAtRunTime) != 0;
  });
  return policy;
}

// What is wrong with the files, the rehearsal has told.
InstalledPolicy ReadFiles(const std::string& policyDir) {
  const QuietErrors quiet;
  return ReadPolicyDirectory(policyDir, SecPolicy::kPartnerDomainsDir).policy;
}

void FindStaying(const InstalledPolicy& files, const InstalledPolicy& installed, LoadPlan& plan) {
  for (const DomainDifference& domain : Compare(files, installed).domains) {
    if (domain.IsNew()) {
      plan.stayingDomains.push_back(domain.name);
      continue;
    }
    for (const std::string& rule : domain.added) plan.stayingRules.push_back({domain.name, rule});
  }
}

using LabelNames = std::map<unsigned int, std::string>;

LabelNames LabelNamesOf(const InstalledPolicy& policy) {
  LabelNames names;
  for (const auto& [name, id] : policy.objects) names.emplace(id, name);
  return names;
}

// A label may have gone while files still carry its number.
std::string NameOf(unsigned int id, const LabelNames& names) {
  const auto found = names.find(id);
  return found == names.end() ? "#" + std::to_string(id) : found->second;
}

}  // namespace

LoadPlan MakeLoadPlan(const std::string& policyDir, const LoadRehearsal& rehearsal) {
  const InstalledPolicy before = ReadState(rehearsal.StateBefore());
  const InstalledPolicy after = ReadState(rehearsal.StateAfter());
  LoadPlan plan;
  plan.difference = Compare(before, after);
  const LabelNames oldNames = LabelNamesOf(before);
  const LabelNames newNames = LabelNamesOf(after);
  for (const auto& change : rehearsal.Labels()) {
    if (!change.IsLasting()) continue;
    plan.labels.push_back(
        {change.path, NameOf(change.before, oldNames), NameOf(change.after, newNames)});
  }
  FindStaying(ReadFiles(policyDir), ReadFilePart(rehearsal.StateAfter()), plan);
  return plan;
}

}  // namespace SecPolicyCli
