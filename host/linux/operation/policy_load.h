#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/linux/files/real_path.h"

// A policy that is installed from files as a whole. Everything throws Braxo::Lib::BraxoException
// when the state cannot be used.
namespace LinuxHost {

// Which files: each kind of load removes what its own files no longer have, and leaves the others'.
enum class LoadKind { kEarly = 1, kFull = 2 };

struct LoadSource {
  LoadKind kind = LoadKind::kFull;
  std::string directory;
  std::vector<std::string> domains;  // the names of all domains that its files define
};

// What was installed by earlier loads of the kind, and no file has any more.
struct LoadRemainder {
  std::uint64_t rules = 0;
  std::vector<std::string> domains;

  bool IsEmpty() const { return rules == 0 && domains.empty(); }
};

// How a load left the state.
struct LoadEnding {
  LoadRemainder removed;
  LoadRemainder staying;  // as nothing was to be removed, or worlds run in the domains
};

class HostState;
class Transaction;

// All that this thread installs while it lives becomes visible to others with Commit(), in one
// step, or never. Only one at a time. Others may read meanwhile; who wants to write waits.
class PolicyTransaction {
 public:
  explicit PolicyTransaction(HostState& hostState);
  PolicyTransaction(const PolicyTransaction&) = delete;
  PolicyTransaction& operator=(const PolicyTransaction&) = delete;

  // Undoes everything unless it was committed.
  ~PolicyTransaction();

  // What is installed from now on comes from these files. Domains that earlier loads of the kind
  // have defined and that no file defines any more cannot be named in rules.
  void BeginLoad(const LoadSource& source);

  // The rules about paths that are installed from now on are in this line of the file of their
  // domain: the kernel is told paths without their lines.
  void SetLine(unsigned int line);

  // The files have been read. With `remove`, what earlier loads of the kind have installed and this
  // one has not is removed, and what it had replaced is back; domains in which worlds run stay.
  LoadEnding EndLoad(bool remove);

  void Commit();

  // Undoes everything now, for a process that is about to end in an unusual way.
  void Undo();

 private:
  std::shared_ptr<HostState> state;
  std::unique_ptr<Transaction> transaction;
  const OneLook look;
  LoadKind kind = LoadKind::kFull;
  std::vector<std::string> defined;
};

}  // namespace LinuxHost
