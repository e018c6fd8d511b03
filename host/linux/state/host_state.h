#pragma once

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "host/linux/common/inode_origin.h"
#include "host/linux/state/store.h"

namespace LinuxHost {

// Of the schema of the state, and so of the saved ones.
inline constexpr std::int32_t kStateVersion = 3;

class DomainTable;
class FilePolicyTable;
class LabelTable;
class ParameterRuleTable;
class RuleTable;
class WorldTable;

// What a kernel with an access-control module keeps: domains, labels, rules, file policies, worlds
// and inode origins. One database that lives and dies with a boot, shared by all processes: each
// call is atomic, is seen by the others at once, and outlives its caller. Failures are HostErrors.
class HostState : public std::enable_shared_from_this<HostState> {
 public:
  // The calling thread's connection, opened, and the state created with its built-in contents, at
  // first use, of the state at StatePath(). A new connection replaces one whose file is gone, or
  // that a fork left behind. The reference holds until the next call of Current() or Find().
  static HostState& Current();

  // The same, but null where there is no state.
  static HostState* Find();

  explicit HostState(const std::string& path);
  HostState(const HostState&) = delete;
  HostState& operator=(const HostState&) = delete;
  ~HostState();

  Store& Database() { return store; }

  // The directory that the state lies in.
  std::string Directory() const;

  DomainTable& Domains() { return *domains; }
  LabelTable& Labels() { return *labels; }
  RuleTable& Rules() { return *rules; }
  ParameterRuleTable& ParameterRules() { return *parameterRules; }
  FilePolicyTable& FilePolicies() { return *filePolicies; }
  WorldTable& Worlds() { return *worlds; }

  // Back to the built-in contents, in one step: what a boot starts from.
  void Reset();

  // Records where inodes came from, all or none; replaces earlier records of the same inodes.
  void RecordOrigins(std::span<const InodeOrigin> origins);

  // Where the inode came from; empty when it came from no tardisk.
  std::optional<InodeOrigin> FindOrigin(dev_t device, ino_t inode);

  // The real extended attribute that carries labels on this machine, empty while none is chosen.
  // Answered from memory as long as nothing was committed.
  const std::string& LabelAttribute();

  // Chooses the attribute for the life of this state; the first choice stays. Returns the one that
  // holds.
  const std::string& ChooseLabelAttribute(const std::string& name);

  // Makes the tables forget what other processes have changed since it was read. Looks at the
  // database only when something was committed since the last call.
  void Refresh();

  // Makes the tables forget all that they know: it may have been undone.
  void Forget();

  // The number of the load that is installing its policy, 0 while none is.
  std::int64_t CurrentLoad() const { return currentLoad; }
  void SetCurrentLoad(std::int64_t number) { currentLoad = number; }

  // The line of the policy that is installed now, for what is installed without one; 0 for none.
  unsigned int CurrentLine() const { return currentLine; }
  void SetCurrentLine(unsigned int line) { currentLine = line; }

 private:
  Store store;
  std::unique_ptr<DomainTable> domains;
  std::unique_ptr<LabelTable> labels;
  std::unique_ptr<RuleTable> rules;
  std::unique_ptr<ParameterRuleTable> parameterRules;
  std::unique_ptr<FilePolicyTable> filePolicies;
  std::unique_ptr<WorldTable> worlds;
  bool marked = false;
  Store::CommitMark seen{};
  std::string labelAttribute;
  std::int64_t currentLoad = 0;
  unsigned int currentLine = 0;
};

}  // namespace LinuxHost
