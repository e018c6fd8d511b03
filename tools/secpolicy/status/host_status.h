#pragma once

#include <cstddef>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "bundle/installed_bundle.h"
#include "host/linux/operation/load_record.h"
#include "host/linux/operation/world_entry.h"
#include "installed/installed_policy.h"
#include "module/module_status.h"

namespace SecPolicyCli {

// The bundle that the files of the host's policy came from.
struct BundleStatus {
  std::optional<InstalledBundle> bundle;  // nothing when it cannot be told
  std::string problem;                    // why
  std::vector<std::string> edits;         // files that differ from the bundle's
  bool isLoaded = false;  // the latest full load was of this bundle, and all of it is installed
};

// What `status` tells of a host.
struct HostStatus {
  Policy::InstalledPolicy policy;
  std::vector<InstalledTardisk> tardisks;
  std::optional<LinuxHost::LoadRecord> load;
  std::optional<BundleStatus> bundle;
  std::map<Policy::Level, std::vector<std::string>> domainsByLevel;
  std::map<Policy::RuleKind, std::size_t> rulesByKind;
  std::size_t ruleCount = 0;
  std::vector<std::string>
      domainsWithoutFile;  // what loads have installed and the latest has found in no file
  std::size_t rulesWithoutLine = 0;
  std::vector<LinuxHost::PlacedWorld> worlds;
  std::optional<ModuleStatus> module;  // of the machine itself alone
  bool isLabelling = false;  // a load --all-or-nothing gives labels, or was killed meanwhile

  // Beside the one that is built in, there are domains only when something was loaded.
  bool IsLoaded() const { return policy.domains.size() > 1; }
  bool HasProblems() const { return load && load->ending != "done"; }
  // Whether the kernel is to keep the policy, and does not.
  bool IsModuleBroken() const { return module && module->isWanted && !module->IsWell(); }
};

// Throws what the host throws.
HostStatus ReadStatus();

}  // namespace SecPolicyCli
