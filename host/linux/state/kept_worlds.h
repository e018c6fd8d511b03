#pragma once

#include <chrono>
#include <map>
#include <memory>
#include <optional>
#include <string>

namespace Enforce {
class RunningModule;
}

namespace LinuxHost {

// The processes that the module has in domains, by its own word: empty for a state that it does not
// keep. Everything throws what the module throws, as who is not known to be in no domain may be in
// any.
class KeptWorlds {
 public:
  explicit KeptWorlds(const std::string& state);

  // The module that keeps the state; null where none does.
  std::unique_ptr<Enforce::RunningModule> FindKeeper() const;

  // The domains of all that are in one, by their processes.
  std::map<int, unsigned int> Read() const;

  // The same as of a moment ago, for who asks for one domain after the other.
  const std::map<int, unsigned int>& ReadRecent();

  // The domain of a process; nothing when it is in none, or not told.
  std::optional<unsigned int> FindDomainOf(int process) const;

 private:
  const std::string mark;
  std::map<int, unsigned int> recent;
  std::chrono::steady_clock::time_point readAt;
};

}  // namespace LinuxHost
