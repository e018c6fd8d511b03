#include <iostream>
#include <map>
#include <vector>

#include "ending.h"
#include "enforce/published.h"
#include "error_list.h"
#include "host/linux/operation/state_use.h"
#include "host/linux/operation/world_entry.h"
#include "monitor/journal.h"
#include "policy/installed_policy.h"
#include "root.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/secpolicy.h"
#include "text/format.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// Who is confined stays so by the level of the entry.
void TellOfOlderLevels() {
  SecPolicy::TeskAccessInterfaceImpl access;
  std::size_t count = 0;
  for (const LinuxHost::PlacedWorld& world : LinuxHost::ListWorlds(LinuxHost::CurrentState())) {
    const auto domain = Policy::ReadDomain(access, world.domainId);
    if (world.level && domain && *world.level != domain->level) ++count;
  }
  if (count == 0) return;
  std::cerr << "still at the level of the entry: " << CountOf(count, "world") << "; "
            << Call("status") << " lists each, and a new start takes the new level" << std::endl;
}

std::vector<Policy::InstalledDomain> ListDomains() {
  SecPolicy::TeskAccessInterfaceImpl access;
  return Policy::ListDomains(access);
}

// Writes a line for each domain that has another level than it had `earlier`, and returns how
// many there are.
std::size_t TellOfChanges(const std::vector<Policy::InstalledDomain>& earlier) {
  std::map<unsigned int, Policy::Level> levels;
  for (const Policy::InstalledDomain& domain : earlier) levels.emplace(domain.id, domain.level);
  std::size_t count = 0;
  for (const Policy::InstalledDomain& domain : ListDomains()) {
    const auto had = levels.find(domain.id);
    if (had == levels.end() || had->second == domain.level) continue;
    const std::string before = Policy::TextOf(had->second);
    const std::string after = Policy::TextOf(domain.level);
    const std::string line = domain.name + ": " + before + " -> " + after;
    std::cout << Visible(line) << '\n';
    TellJournal(Event::kLevelChanged, line,
                {{"SECPOLICY_DOMAIN", domain.name},
                 {"SECPOLICY_LEVEL_BEFORE", before},
                 {"SECPOLICY_LEVEL", after}});
    ++count;
  }
  return count;
}

ExitCode Restore() {
  if (LinuxHost::IsStateMissing()) return RefuseWithoutState("restore");
  std::size_t changed = 0;
  const ExitCode end = CallLibrary(
      "restore",
      [&](ErrorList& errors) {
        const auto before = ListDomains();
        SecPolicy::RestoreDomainEnforcement(errors);
        changed = TellOfChanges(before);
        PublishPlansOrTell("restore");
      },
      AdviseOnPrivilege, [&] { return "done (" + CountOf(changed, "level") + " changed)"; });
  if (end == kWell) TellOfOlderLevels();
  return end;
}

Action Define(Syntax&) { return Restore; }

}  // namespace

const Verb kRestore = {
    "restore", "Give every domain its stored enforcement level",
    "Walks the installed domains and gives each the level that 'settings enforcement' stored for\n"
    "it. A domain without a stored level keeps the one it has. Prints each level that changes.\n"
    "\n"
    "Example:\n"
    "  secpolicy settings enforcement appDom permissive\n"
    "  secpolicy restore                    now appDom is permissive",
    Define};

}  // namespace SecPolicyCli
