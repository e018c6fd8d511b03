#include "load/load_run.h"
#include "monitor/journal.h"
#include "policy_dir.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/policy_root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Options {
  bool keep = false;
  bool timing = false;
};

ExitCode LoadEarly(const std::string& dir, const Options& options) {
  if (const auto refusal = RefuseMissingDir("load-early", dir)) return *refusal;
  JournalledLoad journal("load-early", dir);
  return RunLoad({.verb = "load-early",
                  .policyDir = dir,
                  .steps = {{LinuxHost::LoadKind::kEarly, dir, SecPolicy::LoadPolicyEarly}},
                  .keep = options.keep,
                  .timing = options.timing,
                  .watcher = &journal,
                  .mend = {},
                  .prepare = {},
                  .begin = {}});
}

Action Define(Syntax& syntax) {
  const auto dir = AddPolicyDir(syntax, SecPolicy::kEarlyPolicyRoot);
  const auto options = std::make_shared<Options>();
  AddKeep(syntax, options->keep);
  AddTiming(syntax, options->timing);
  return [=] { return LoadEarly(*dir, *options); };
}

}  // namespace

const Verb kLoadEarly = {
    "load-early", "Install the small policy that early boot needs",
    "Installs the domains of the early policy directory, and the objects and the file labels of\n"
    "/etc/zorvan/secpolicy. The first failure ends the load. What an earlier load-early has\n"
    "installed and no file of the directory has any more is removed, unless --keep is given.\n"
    "\n"
    "Example:\n"
    "  secpolicy load-early                 what a boot script runs before the first services",
    Define};

}  // namespace SecPolicyCli
