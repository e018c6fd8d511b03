#include <stdexcept>

#include "ending.h"
#include "enforce/published.h"
#include "host/linux/operation/saved_policy.h"
#include "host/linux/operation/state_use.h"
#include "host/linux/operation/store_copy.h"
#include "load/load_record.h"
#include "monitor/journal.h"
#include "root.h"
#include "saved/saved_state.h"
#include "scratch/scratch_state.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

void PutBack(const std::string& name) {
  const ScratchDirectory scratch;
  const std::string copy = scratch.File("saved.db");
  try {
    LinuxHost::CopyDatabase(SavedStatePath(name), LinuxHost::CopyOf::kSavedState, copy);
    LinuxHost::RestorePolicy(copy);
  } catch (const std::exception& reason) {
    throw std::runtime_error("the saved state '" + name +
                             "' cannot be put back, so nothing was changed: " + reason.what());
  }
  RecordRollback(name);
  TellJournal(Event::kRolledBack, "the saved state '" + name + "' was put back",
              {{"SECPOLICY_SAVED_STATE", name}});
}

ExitCode RollBack(const std::string& name) {
  if (LinuxHost::IsStateMissing()) return RefuseWithoutState("rollback");
  if (!IsSaved(name)) return RefuseUnsaved("rollback", name);
  return CallLibrary(
      "rollback",
      [&](ErrorList&) {
        PutBack(name);
        PublishPlansOrTell("rollback");
      },
      AdviseOnPrivilege,
      [] {
        return "done; the policy files were not changed, and files keep the labels that they "
               "have: " +
               Call("label verify") + " compares them with the policy";
      });
}

Action Define(Syntax& syntax) {
  const auto name = AddSavedName(syntax, "The saved state to put back");
  return [name] { return RollBack(*name); };
}

}  // namespace

const Verb kRollback = {
    "rollback", "Put a saved state back in place of what is installed",
    "Domains, their enforcement levels, rules and roles, and the objects become what they were\n"
    "when the state was saved, in one step: killed on the way, it leaves the old or the new.\n"
    "Running processes stay in their domains; it is refused while any runs in a domain that the\n"
    "saved state does not have. Files keep their labels, and objects their numbers; an object "
    "that\n"
    "was gone comes back with a new number, so label its files again ('label relabel').\n"
    "\n"
    "Examples:\n"
    "  secpolicy diff before-upgrade installed   what would be lost?\n"
    "  secpolicy rollback before-upgrade",
    Define};

}  // namespace SecPolicyCli
