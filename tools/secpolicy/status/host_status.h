#pragma once

#include <cstddef>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "host/linux/operation/load_record.h"
#include "host/linux/operation/world_entry.h"
#include "installed/installed_policy.h"

namespace SecPolicyCli {

// What `status` tells of a host.
struct HostStatus {
  Policy::InstalledPolicy policy;
  std::vector<InstalledTardisk> tardisks;
  std::optional<LinuxHost::LoadRecord> load;
  std::map<Policy::Level, std::vector<std::string>> domainsByLevel;
  std::map<Policy::RuleKind, std::size_t> rulesByKind;
  std::size_t ruleCount = 0;
  std::vector<std::string>
      domainsWithoutFile;  // what loads have installed and no file has any more
  std::size_t rulesWithoutLine = 0;
  std::vector<LinuxHost::PlacedWorld> worlds;

  // Beside the one that is built in, there are domains only when something was loaded.
  bool IsLoaded() const { return policy.domains.size() > 1; }
  bool HasProblems() const { return load && load->ending != "done"; }
};

// Throws what the host throws.
HostStatus ReadStatus();

}  // namespace SecPolicyCli
