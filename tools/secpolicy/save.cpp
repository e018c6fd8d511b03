#include <memory>

#include "command_line.h"
#include "ending.h"
#include "host/linux/operation/saved_policy.h"
#include "host/linux/operation/state_use.h"
#include "root.h"
#include "saved/saved_state.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

ExitCode Save(const std::string& name, bool force) {
  if (LinuxHost::IsStateMissing()) return RefuseWithoutState("save");
  if (!force && IsSaved(name)) {
    return Refuse("save", "there is a saved state '" + name +
                              "' already. Give --force to replace it, or choose another name.");
  }
  return CallLibrary(
      "save",
      [&](ErrorList&) {
        LinuxHost::SaveState(LinuxHost::StatePath(), SavedStatePath(name), force);
      },
      AdviseOnPrivilege);
}

Action Define(Syntax& syntax) {
  const auto name = AddSavedName(syntax, "The name to save it under");
  const auto force = std::make_shared<bool>(false);
  syntax.AddFlag("--force", *force, "Replace a saved state of this name");
  return [name, force] { return Save(*name, *force); };
}

}  // namespace

const Verb kSave = {
    "save", "Keep what is installed now under a name",
    "Copies the installed state, domains, rules, objects and all, to a file of its own in\n"
    "/var/lib/secpolicy/saved, which outlives a boot. 'history' lists what is saved, 'diff'\n"
    "compares with it, and 'rollback' puts it back. The labels that files carry are not saved.\n"
    "\n"
    "Examples:\n"
    "  secpolicy save before-upgrade\n"
    "  secpolicy save --force nightly       replace the one of that name",
    Define};

}  // namespace SecPolicyCli
