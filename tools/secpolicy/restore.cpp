#include "ending.h"
#include "error_list.h"
#include "root.h"
#include "secpolicy/observed/loading.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

Action Define(Syntax&) {
  return [] {
    return CallLibrary(
        "restore", [](ErrorList& errors) { SecPolicy::RestoreDomainEnforcement(errors); },
        AdviseOnPrivilege);
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
