#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace LinuxHost {
class PolicyTransaction;
}

// Where the files of a policy are.
namespace SecPolicyCli {

// A directory of domains.
struct DomainsDir {
  std::string path;
  std::string prefix;    // of the names of its domains
  std::string expected;  // the directory in it that belongs there, if any
};

// The directories of the policy `root` with domains, in the order in which a boot comes to them.
// Those of early boot and of partners may be missing.
std::vector<DomainsDir> DomainsDirsOf(const std::string& root);

// The policy directory that the file belongs to; that of early boot is part of the one above it.
std::optional<std::filesystem::path> FindPolicyOf(const std::filesystem::path& file);

// As for a load of the policy `root`, domains that earlier loads have defined and no file defines
// any more are not there.
void BeginLoadOf(LinuxHost::PolicyTransaction& load, const std::string& root);

}  // namespace SecPolicyCli
