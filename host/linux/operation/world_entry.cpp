#include "host/linux/operation/world_entry.h"

#include <sys/prctl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <fstream>
#include <string>

#include "host/linux/common/host_error.h"
#include "host/linux/operation/world_records.h"
#include "host/linux/state/domain.h"
#include "host/linux/state/host_state.h"

namespace LinuxHost {
namespace {

// 0 where it cannot be told.
pid_t ParentOf(pid_t process) {
  std::ifstream status("/proc/" + std::to_string(process) + "/status");
  std::string word;
  while (status >> word) {
    pid_t parent = 0;
    if (word == "PPid:" && status >> parent) return parent;
  }
  return 0;
}

// What others say of their processes does not count for one of this user that they have started.
std::vector<WorldRecord> OwnRecords() {
  if (geteuid() == 0) return {};
  std::vector<WorldRecord> records = ReadWorldRecords();
  std::erase_if(records, [](const WorldRecord& record) { return record.user != geteuid(); });
  return records;
}

std::optional<Policy::Level> LevelOf(const World& world, HostState& state) {
  if (!world.isKept) return Policy::FindLevel(world.level);
  const Domain* const domain = state.Domains().Find(world.domainId);
  return domain == nullptr ? std::nullopt : Policy::FindLevel(domain->level);
}

}  // namespace

void EnterWorld(unsigned int id, Policy::Level level) {
  HostState::Current().Worlds().Record(getpid(), id, TextOf(level));
}

void EnterKeptWorld(unsigned int id) { HostState::Current().Worlds().Record(getpid(), id); }

std::vector<PlacedWorld> ListWorlds(HostState& state) {
  state.Refresh();
  std::vector<PlacedWorld> worlds;
  for (const World& world : state.Worlds().All()) {
    worlds.push_back({world.id, world.domainId, LevelOf(world, state)});
  }
  for (const WorldRecord& record : ReadWorldRecords()) {
    if (std::ranges::count(worlds, record.id, &PlacedWorld::id) != 0) continue;
    const Domain* const domain = state.Domains().Find(record.domain);
    worlds.push_back({record.id, domain == nullptr ? kDomainSlots : domain->id,
                      Policy::FindLevel(record.level)});
  }
  std::ranges::sort(worlds, {}, &PlacedWorld::id);
  return worlds;
}

std::vector<int> ListKeptWorlds(HostState& state, unsigned int id) {
  return state.Worlds().KeptIn(id);
}

std::optional<PlacedWorld> FindWorldAbove(HostState& state, int process) {
  const std::vector<PlacedWorld> worlds = ListWorlds(state);
  for (pid_t above = process; above > 0; above = ParentOf(above)) {
    const auto found = std::ranges::find(worlds, above, &PlacedWorld::id);
    if (found != worlds.end()) return *found;
  }
  return std::nullopt;
}

unsigned int DomainOfCaller() {
  HostState& state = HostState::Current();
  const std::vector<WorldRecord> records = OwnRecords();
  // A child is in the domain of its parent, unless it was placed elsewhere itself.
  for (pid_t process = getpid(); process > 1; process = ParentOf(process)) {
    if (const auto placed = state.Worlds().FindDomainOf(process)) return *placed;
    const auto record = std::ranges::find(records, process, &WorldRecord::id);
    if (record != records.end()) return state.Domains().Get(record->domain).id;
  }
  if (prctl(PR_GET_NO_NEW_PRIVS, 0, 0, 0, 0) == 1) {
    throw HostError(ESRCH,
                    "the domain of this process is not known: it was confined, and nobody recorded "
                    "where");
  }
  return kStartDomain;
}

}  // namespace LinuxHost
