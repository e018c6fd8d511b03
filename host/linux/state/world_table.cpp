#include "host/linux/state/world_table.h"

#include <signal.h>

#include <cerrno>
#include <fstream>
#include <sstream>
#include <string>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/state/domain.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

bool IsAlive(int world) { return world > 0 && (kill(world, 0) == 0 || errno == EPERM); }

// When the process was started, in clock ticks since boot: tells it from a later one with the same
// number. 0 where it cannot be told.
std::int64_t StartOf(int world) {
  std::ifstream file(StrCat("/proc/", world, "/stat"));
  std::string text;
  std::getline(file, text);
  // The second field is the program's name in parentheses, which may hold anything; the start is
  // the twentieth field behind it.
  const auto nameEnd = text.rfind(')');
  if (nameEnd == std::string::npos) return 0;
  std::istringstream fields(text.substr(nameEnd + 1));
  std::string skipped;
  for (int field = 1; field < 20; ++field) fields >> skipped;
  std::int64_t start = 0;
  fields >> start;
  return start;
}

bool IsStill(int world, std::int64_t started) {
  return IsAlive(world) && StartOf(world) == started;
}

}  // namespace

void WorldTable::RequireAlive(int world) {
  if (!IsAlive(world)) throw HostError(ESRCH, StrCat("no world has the identifier ", world));
}

void WorldTable::Place(int world, unsigned int domainId, const std::string& level) {
  RequireAlive(world);
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
