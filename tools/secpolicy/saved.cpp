#include <unistd.h>

#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "ending.h"
#include "error_list.h"
#include "host/linux/common/host_error.h"
#include "installed/installed_json.h"
#include "query/ask.h"
#include "root.h"
#include "saved/saved_state.h"
#include "scratch/scratch_state.h"
#include "secpolicy/observed/loading.h"
#include "text/format.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::TeskAccessInterfaceImpl;

void WriteText(const SavedState&, ErrorList& errors) {
  TeskAccessInterfaceImpl access;
  SecPolicy::DisplayPolicyDomains(access, "", errors);
  SecPolicy::DisplayPolicyObjects(access);
}

void WriteJson(const SavedState& saved, ErrorList&) {
  TeskAccessInterfaceImpl access;
  Json json = {
      {"schema", "secpolicy.saved/1"}, {"name", saved.name}, {"time", IsoTime(saved.time)}};
  json.Add(ToJson(ReadInstalledPolicy(access)));
  std::cout << json.Text();
}

ExitCode Show(const std::string& name, const std::string& format) {
  const auto saved = FindSaved(name);
  if (!saved) return RefuseUnsaved("saved show", name);
  return CallLibrary(
      "saved show",
      [&](ErrorList& errors) {
        const CopiedState copied(SavedStatePath(name), LinuxHost::CopyOf::kSavedState);
        (format == "json" ? WriteJson : WriteText)(*saved, errors);
      },
      AdviseOnPrivilege);
}

Action DefineShow(Syntax& syntax) {
  const auto name = AddSavedName(syntax, "The saved state to show");
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Show(*name, *format); };
}

// A link goes, and not what it leads to.
ExitCode Delete(const std::string& name) {
  if (!IsSaved(name)) return RefuseUnsaved("saved delete", name);
  return CallLibrary(
      "saved delete",
      [&](ErrorList&) {
        const std::string path = SavedStatePath(name);
        if (unlink(path.c_str()) != 0) LinuxHost::ThrowErrno("cannot delete ", path);
      },
      AdviseOnPrivilege);
}

Action DefineDelete(Syntax& syntax) {
  const auto name = AddSavedName(syntax, "The saved state to delete");
  return [=] { return Delete(*name); };
}

const Kind kShow = {"show", "Show the domains, rules and objects of a saved state",
                    "Prints them as 'display' prints what is installed.\n"
                    "\n"
                    "Examples:\n"
                    "  secpolicy saved show before-upgrade\n"
                    "  secpolicy saved show before-upgrade --format json | jq -r '.domains[].name'",
                    DefineShow};

const Kind kDelete = {"delete", "Delete a saved state, for good",
                      "What is installed stays as it is.\n"
                      "\n"
                      "Example:\n"
                      "  secpolicy saved delete before-upgrade",
                      DefineDelete};

Action Define(Syntax& syntax) { return syntax.AddKinds(std::vector<Kind>{kShow, kDelete}); }

}  // namespace

const Verb kSaved = {
    "saved",
    "Show and delete saved states",
    "'save' makes them, 'history' lists them, and 'rollback' puts one back. They lie in\n"
    "/var/lib/secpolicy/saved, and outlive a boot.\n"
    "\n"
    "Examples:\n"
    "  secpolicy saved show before-upgrade\n"
    "  secpolicy saved delete before-upgrade",
    Define,
    nullptr,
    true};

}  // namespace SecPolicyCli
