#include "host/linux/state/world_table.h"

#include <cerrno>
#include <map>
#include <string>

#include "braxo/misc/strcat.h"
#include "host/enforce/module/entry_point.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/process.h"
#include "host/linux/state/domain.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

unsigned int CountOf(const std::map<int, unsigned int>& worlds, unsigned int domainId) {
  unsigned int count = 0;
  for (const auto& [world, domain] : worlds) {
    if (domain == domainId) ++count;
  }
  return count;
}

}  // namespace

void WorldTable::RequireAlive(int world) {
  if (!IsAlive(world)) throw HostError(ESRCH, StrCat("no world has the identifier ", world));
}

void WorldTable::Record(int world, unsigned int domainId, const std::string& level) {
  RequireAlive(world);
  // No plan depends on it.
  const UntoldCommits untold(store);
  const int placed =
      store.Run("INSERT OR REPLACE INTO world SELECT ?1, ?2, id, ?4 FROM domain WHERE id = ?3",
                world, StartOf(world), domainId, level);
  if (placed == 0) throw HostError(ENOENT, StrCat("unknown domain ", domainId));
}

// The record comes first: who is in the domain by then may not be able to write it any more, and no
// other domain gets the number meanwhile.
void WorldTable::Place(int world, unsigned int domainId) {
  const auto module = kept.FindKeeper();
  Record(world, domainId);
  if (module != nullptr) module->Place(world, domainId);
}

std::optional<unsigned int> WorldTable::FindDomainOf(int world) {
  if (const auto domain = kept.FindDomainOf(world)) return domain;
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
  const std::map<int, unsigned int> those = kept.Read();
  Rows rows = store.Select("SELECT id, started, domain_id, level FROM world ORDER BY id");
  while (rows.Next()) {
    const auto id = static_cast<int>(rows.Integer(0));
    if (!IsStill(id, rows.Integer(1))) continue;
    const auto found = those.find(id);
    const bool isKept = found != those.end();
    worlds.push_back(
        {.id = id,
         .domainId = isKept ? found->second : static_cast<unsigned int>(rows.Integer(2)),
         .level = std::string(rows.Text(3)),
         .isKept = isKept});
  }
  return worlds;
}

unsigned int WorldTable::CountIn(unsigned int domainId, bool isNow) {
  const std::map<int, unsigned int> those = isNow ? kept.Read() : kept.ReadRecent();
  unsigned int count = CountOf(those, domainId);
  Rows rows = store.Select("SELECT id, started FROM world WHERE domain_id = ?1", domainId);
  while (rows.Next()) {
    const auto id = static_cast<int>(rows.Integer(0));
    if (!those.contains(id) && IsStill(id, rows.Integer(1))) ++count;
  }
  return count;
}

std::vector<int> WorldTable::KeptIn(unsigned int domainId) const {
  std::vector<int> found;
  for (const auto& [world, domain] : kept.Read()) {
    if (domain == domainId) found.push_back(world);
  }
  return found;
}

void WorldTable::RequireNoneKept() const {
  for (const auto& [world, domain] : kept.Read()) {
    if (domain == kStartDomain) continue;
    throw HostError(EBUSY, StrCat("The kernel keeps domains in which worlds run, such as ", world,
                                  ", and a boot would take them away. \"secpolicy load\" installs "
                                  "the policy without that; else end them, or the module"));
  }
}

bool WorldTable::IsKeptIn(unsigned int domainId) {
  return CountOf(kept.ReadRecent(), domainId) != 0;
}

}  // namespace LinuxHost
