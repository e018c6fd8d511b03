#pragma once

#include <span>
#include <string>
#include <vector>

#include "host/linux/state/domain_table.h"
#include "policy/limits.h"
#include "policy/rule.h"

namespace LinuxHost {

// The longest path of a file policy in bytes.
constexpr std::size_t kMaxPolicyPath = Policy::kLongestPolicyPath;

// What a domain, or one world in it, may do with a path.
struct FilePolicy {
  DomainReference domain;
  int world = 0;  // 0: all worlds of the domain
  std::string path;
  unsigned int permission = 0;
  unsigned int line = 0;
};

// The file policies of domains, which are their file-path access rules, and those of single worlds.
// Failures are HostErrors.
class FilePolicyTable {
 public:
  FilePolicyTable(StateBase& stateBase, DomainTable& domainTable)
      : base(stateBase), domains(domainTable) {}

  // Installs policies behind all others, all or none; one for the same domain, world and path goes.
  void Install(std::span<const FilePolicy> policies);

  // Throws with ENOENT when there is no such policy.
  void Remove(unsigned int domainId, int world, const std::string& path);

  // Changes the permission of all policies of the domain for the path, those of worlds included.
  // Throws with ENOENT when there is none.
  void Update(unsigned int domainId, const std::string& path, unsigned int permission);

  // Turns the policies that single worlds have for `oldPath` into policies for `newPath`. Throws
  // with ENOENT when there is none.
  void RePoint(const std::string& oldPath, const std::string& newPath);

  // All policies of a domain, those of its worlds included.
  unsigned int Count(unsigned int domainId);
  std::vector<FilePolicy> All(unsigned int domainId);

  // The policies that hold for the whole domain, in the order of their installation.
  std::vector<Policy::Rule> Read(unsigned int domainId);

 private:
  void RequireDomain(unsigned int domainId);
  bool InstallIfUnchanged(const FilePolicy& policy);

  StateBase& base;
  DomainTable& domains;
};

}  // namespace LinuxHost
