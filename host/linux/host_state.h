#pragma once

#include <sys/types.h>

#include <memory>
#include <span>
#include <string>

#include "store.h"

namespace LinuxHost {

class DomainTable;
class LabelTable;
class RuleTable;
class FilePolicyTable;

// Which tardisk an inode came from.
struct InodeOrigin {
  dev_t device = 0;
  ino_t inode = 0;
  std::string tardisk;  // the bare file name of the tardisk
};

// What a kernel with an access-control module keeps: domains, labels, rules, file policies, worlds
// and inode origins. One database that lives and dies with a boot, shared by all processes: each
// call is atomic, is seen by the others at once, and outlives its caller. Failures are HostErrors.
class HostState {
 public:
  // The calling thread's connection, opened, and the state created with its built-in contents, at
  // first use. The state lies at /run/secpolicy/host.db unless SECPOLICY_HOST_STATE names another
  // absolute path. The reference holds until the next call of Current().
  static HostState& Current();

  explicit HostState(const std::string& path);
  HostState(const HostState&) = delete;
  HostState& operator=(const HostState&) = delete;
  ~HostState();

  Store& Database() { return store; }
  DomainTable& Domains() { return *domains; }
  LabelTable& Labels() { return *labels; }
  RuleTable& Rules() { return *rules; }
  FilePolicyTable& FilePolicies() { return *filePolicies; }

  // Back to the built-in contents, in one step: what a boot starts from.
  void Reset();

  // Records where inodes came from, all or none; replaces earlier records of the same inodes.
  void RecordOrigins(std::span<const InodeOrigin> origins);

  // The name of the tardisk that the inode came from, empty when it came from none.
  std::string FindOrigin(dev_t device, ino_t inode);

  // The real extended attribute that carries labels on this machine, empty while none is chosen.
  // Answered from memory as long as nothing was committed.
  const std::string& LabelAttribute();

  // Chooses the attribute for the life of this state; the first choice stays. Returns the one that
  // holds.
  const std::string& ChooseLabelAttribute(const std::string& name);

  // Forgets what other processes have changed since it was read. Costs nothing when none did.
  void Refresh();

 private:
  Store store;
  std::unique_ptr<DomainTable> domains;
  std::unique_ptr<LabelTable> labels;
  std::unique_ptr<RuleTable> rules;
  std::unique_ptr<FilePolicyTable> filePolicies;
  Store::CommitMark seen{};
  std::string labelAttribute;
};

}  // namespace LinuxHost
