#pragma once

#include <optional>
#include <string>
#include <vector>

#include "host/linux/state/kept_worlds.h"
#include "host/linux/state/store.h"

namespace LinuxHost {

// A process that was placed in a domain.
struct World {
  int id = 0;
  unsigned int domainId = 0;
  std::string level;    // that confines it; empty when none does, or the module
  bool isKept = false;  // by the module, in this domain
};

// The worlds, which are processes, and the domains that they were placed in. A world runs in the
// start domain until it is placed elsewhere. Those that the module has in a domain are worlds of
// it, whatever else is known of them. Failures are HostErrors, or what the module throws.
class WorldTable {
 public:
  explicit WorldTable(Store& database) : store(database), kept(database.Path()) {}

  // Throws with ESRCH when no such process lives.
  static void RequireAlive(int world);

  // Records that a living world is in a domain, for the rest of its life or until it is placed
  // elsewhere. `level` is the word of the level that it is confined by from now on; empty where
  // nobody confines it, or the module.
  void Record(int world, unsigned int domainId, const std::string& level = {});

  // The same without a level, and puts it there in the kernel as well where the module keeps the
  // state: with all its threads, and without the children that it has.
  void Place(int world, unsigned int domainId);

  // Those that live and were placed, in ascending order of their identifiers.
  std::vector<World> All();

  // The domain that a living world runs in.
  unsigned int DomainOf(int world);

  // The same, but nothing for one that was never placed.
  std::optional<unsigned int> FindDomainOf(int world);

  // The number of living worlds that were placed in the domain; of those that the module has there
  // as of a moment ago, unless `isNow`.
  unsigned int CountIn(unsigned int domainId, bool isNow = true);

  // Those that the module has there, in ascending order of their identifiers.
  std::vector<int> KeptIn(unsigned int domainId) const;

  // Throws when the module has any in another domain than the start domain: the domain's number
  // would be given to another.
  void RequireNoneKept() const;

  // True when the module had some there a moment ago.
  bool IsKeptIn(unsigned int domainId);

 private:
  Store& store;
  KeptWorlds kept;
};

}  // namespace LinuxHost
