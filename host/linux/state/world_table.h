#pragma once

#include <optional>

#include "host/linux/state/store.h"

namespace LinuxHost {

// The worlds, which are processes, and the domains that they were placed in. A world runs in the
// start domain until it is placed elsewhere. Failures are HostErrors.
class WorldTable {
 public:
  explicit WorldTable(Store& database) : store(database) {}

  // Throws with ESRCH when no such process lives.
  static void RequireAlive(int world);

  // Places a living world in a domain, for the rest of its life or until it is placed again.
  void Place(int world, unsigned int domainId);

  // The domain that a living world runs in.
  unsigned int DomainOf(int world);

  // The same, but nothing for one that was never placed.
  std::optional<unsigned int> FindDomainOf(int world);

  // The number of living worlds that were placed in the domain.
  unsigned int CountIn(unsigned int domainId);

 private:
  Store& store;
};

}  // namespace LinuxHost
