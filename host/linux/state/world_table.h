#pragma once

#include <optional>
#include <string>
#include <vector>

#include "host/linux/state/store.h"

namespace LinuxHost {

// A process that was placed in a domain.
struct World {
  int id = 0;
  unsigned int domainId = 0;
  std::string level;  // that confines it; empty when none does
};

// The worlds, which are processes, and the domains that they were placed in. A world runs in the
// start domain until it is placed elsewhere. Failures are HostErrors.
class WorldTable {
 public:
  explicit WorldTable(Store& database) : store(database) {}

  // Throws with ESRCH when no such process lives.
  static void RequireAlive(int world);

  // Places a living world in a domain, for the rest of its life or until it is placed again.
  // `level` is the word of the level that it is confined by from now on; empty where nobody
  // confines it.
  void Place(int world, unsigned int domainId, const std::string& level = {});

  // Those that live and were placed, in ascending order of their identifiers.
  std::vector<World> All();

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
