#include <iostream>

#include "ending.h"
#include "error_list.h"
#include "host/linux/operation/state_use.h"
#include "host/linux/operation/world_entry.h"
#include "policy/installed_policy.h"
#include "root.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/secpolicy.h"
#include "text/format.h"
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

Action Define(Syntax&) {
  return [] {
    const ExitCode end = CallLibrary(
        "restore", [](ErrorList& errors) { SecPolicy::RestoreDomainEnforcement(errors); },
        AdviseOnPrivilege);
    if (end == kWell) TellOfOlderLevels();
    return end;
  };
}

}  // namespace

const Verb kRestore = {
    "restore", "Give every domain its stored enforcement level",
    "Walks the installed domains and gives each the level that 'settings enforcement' stored for\n"
    "it. A domain without a stored level keeps the one it has.\n"
    "\n"
    "Example:\n"
    "  secpolicy settings enforcement appDom permissive\n"
    "  secpolicy restore                    now appDom is permissive",
    Define};

}  // namespace SecPolicyCli
