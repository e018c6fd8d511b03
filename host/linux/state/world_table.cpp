#include "host/linux/state/world_table.h"

#include <cerrno>
#include <string>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/process.h"
#include "host/linux/state/domain.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {

void WorldTable::RequireAlive(int world) {
  if (!IsAlive(world)) throw HostError(ESRCH, StrCat("no world has the identifier ", world));
}

void WorldTable::Place(int world, unsigned int domainId, const std::string& level) {
  RequireAlive(world);
  // No plan depends on it.
  const UntoldCommits untold(store);
  const int placed =
      store.Run("INSERT OR REPLACE INTO world SELECT ?1, ?2, id, ?4 FROM domain WHERE id = ?3",
                world, StartOf(world), domainId, level);
  if (placed == 0) throw HostError(ENOENT, StrCat("unknown domain ", domainId));
}

std::optional<unsigned int> WorldTable::FindDomainOf(int world) {
  Rows rows = store.Select("SELECT started, domain_id FROM world WHERE id = ?1", world);
  if (!rows.Next() || !IsStill(world, rows.Integer(0))) return std::nullopt;
  return static_cast<unsigned int>(rows.Integer(1));
}

unsigned int WorldTable::DomainOf(int world) {
  RequireAlive(world);
  return FindDomainOf(world).value_or(kStartDomain);
}

std::vector<World> WorldTable::All() {
  std::vector<World> worlds;
  Rows rows = store.Select("SELECT id, started, domain_id, level FROM world ORDER BY id");
  while (rows.Next()) {
    const auto id = static_cast<int>(rows.Integer(0));
    if (!IsStill(id, rows.Integer(1))) continue;
    worlds.push_back({.id = id,
                      .domainId = static_cast<unsigned int>(rows.Integer(2)),
                      .level = std::string(rows.Text(3))});
  }
  return worlds;
}

unsigned int WorldTable::CountIn(unsigned int domainId) {
  unsigned int count = 0;
  Rows rows = store.Select("SELECT id, started FROM world WHERE domain_id = ?1", domainId);
  while (rows.Next()) {
    if (IsStill(static_cast<int>(rows.Integer(0)), rows.Integer(1))) ++count;
  }
  return count;
}

}  // namespace LinuxHost
