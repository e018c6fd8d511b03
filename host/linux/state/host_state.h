#pragma once

#include <sys/types.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "host/linux/common/inode_origin.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/file_policy_table.h"
#include "host/linux/state/keyword_tables.h"
#include "host/linux/state/label_table.h"
#include "host/linux/state/parameter_rule_table.h"
#include "host/linux/state/rule_table.h"
#include "host/linux/state/state_base.h"
#include "host/linux/state/world_table.h"

namespace LinuxHost {

// A regular file that came from a tardisk.
struct UnpackedFile {
  dev_t device = 0;
  ino_t inode = 0;
  std::uint32_t generation = 0;
  std::string tardisk;  // its bare file name
};

// What a kernel with an access-control module keeps: domains, labels, rules, file policies, worlds
// and inode origins. One database that lives and dies with a boot, shared by all processes: each
// call is atomic, is seen by the others at once, and outlives its caller. Failures are HostErrors.
class HostState : public StateBase, public std::enable_shared_from_this<HostState> {
 public:
  // The calling thread's connection, opened, and the state created with its built-in contents, at
  // first use, of the state at StatePath(). A new connection replaces one whose file is gone, or
  // that a fork left behind. The reference holds until the next call of Current() or Find().
  static HostState& Current();

  // The same, but null where there is no state.
  static HostState* Find();

  // The connection of the latest Current(), if that was of the state that is used now, without a
  // look at the file system: for what is asked for each of many files.
  static HostState& Known();

  HostState(const std::string& path, const std::string& shownAs);
  explicit HostState(const std::string& path) : HostState(path, path) {}

  // The directory that the state lies in.
  std::string Directory();

  DomainTable& Domains() { return domains; }
  LabelTable& Labels() { return labels; }
  KeywordTables& Keywords() { return keywords; }
  RuleTable& Rules() { return rules; }
  ParameterRuleTable& ParameterRules() { return parameterRules; }
  FilePolicyTable& FilePolicies() { return filePolicies; }
  WorldTable& Worlds() { return worlds; }

  // Back to the built-in contents, in one step: what a boot starts from.
  void Reset();

  // Records where inodes came from, all or none; replaces earlier records of the same inodes.
  void RecordOrigins(std::span<const InodeOrigin> origins);

  // Where the inode came from; empty when it came from no tardisk.
  std::optional<InodeOrigin> FindOrigin(dev_t device, ino_t inode);

  // Calls `visit` with each regular file that came from a tardisk and that a kernel can tell from
  // others, whether it is still there or not.
  void ForEachUnpackedFile(const std::function<void(const UnpackedFile&)>& visit);

 private:
  // Each stands on those before it.
  WorldTable worlds;
  DomainTable domains;
  LabelTable labels;
  KeywordTables keywords;
  RuleTable rules;
  ParameterRuleTable parameterRules;
  FilePolicyTable filePolicies;
};

}  // namespace LinuxHost
