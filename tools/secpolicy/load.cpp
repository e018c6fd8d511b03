#include "command_line.h"
#include "dry_run/planned_load.h"
#include "load/full_load.h"
#include "monitor/journal.h"
#include "policy_dir.h"
#include "secpolicy/policy_root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Options {
  bool plan = false;
  bool allOrNothing = false;
  bool keep = false;
  bool timing = false;
  PlanOptions planOptions;
};

ExitCode Load(const std::string& dir, const Options& options) {
  if (const auto refusal = RefuseMissingDir("load", dir)) return *refusal;
  LoadRequest load = FullLoad(dir);
  load.keep = options.keep;
  load.allOrNothing = options.allOrNothing;
  load.timing = options.timing;
  if (options.plan) return PlanLoad(load, options.planOptions);
  JournalledLoad journal(load.verb, dir);
  load.watcher = &journal;
  return RunLoad(load);
}

Action Define(Syntax& syntax) {
  const auto dir = AddPolicyDir(syntax, SecPolicy::kPolicyRoot);
  const auto options = std::make_shared<Options>();
  const Option plan = syntax.AddFlag("--plan", options->plan,
                                     "Only show what the load would change; -v shows every file");
  syntax.AddFormat(options->planOptions.format, "the plan", {"text", "json"}).Need(plan);
  syntax
      .AddFlag("--all-or-nothing", options->allOrNothing,
               "Install and label nothing when there is any error")
      .Exclude(plan);
  AddKeep(syntax, options->keep);
  AddTiming(syntax, options->timing).Exclude(plan);
  const Option verbose = syntax.Verbose();
  return [=] {
    options->planOptions.showAll = verbose.IsGiven();
    return Load(*dir, *options);
  };
}

}  // namespace

const Verb kLoad = {
    "load", "Install the full policy",
    "Installs objects, domains, partner domains, tardisk policy and file labels, in this order.\n"
    "A part that fails is reported and the next one is loaded. Tardisk policy and partner domains\n"
    "are always those of /etc/zorvan/secpolicy. Others see what was installed before, or all of\n"
    "it; files get their labels right after that. What earlier loads have installed and no file\n"
    "has any more is removed when the load ends well, unless --keep is given; what services have\n"
    "made and what load-early has installed stays.\n"
    "With --plan the load is done on a copy of what is installed: it shows what it would change\n"
    "and which problems it would have, and changes nothing. Exit status as of the load.\n"
    "With --all-or-nothing any error leaves rules, objects and file labels as they were, and so\n"
    "does a load that is killed.\n"
    "\n"
    "Examples:\n"
    "  secpolicy load                       install the host's policy again after an edit\n"
    "  secpolicy --root /srv/r load -v      the same below /srv/r, and show the progress\n"
    "  secpolicy load /root/new-policy      objects, domains and labels of another directory\n"
    "  secpolicy load --timing              how long does each phase take?\n"
    "  secpolicy load --plan                what would change? -v shows every file\n"
    "  secpolicy load --all-or-nothing      never half a policy",
    Define};

}  // namespace SecPolicyCli
