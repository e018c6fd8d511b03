#include "command_line.h"
#include "policy_dir.h"
#include "rehearsal/planned_load.h"
#include "rehearsal/whole_load.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/secpolicy.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Options {
  bool plan = false;
  bool allOrNothing = false;
  bool timing = false;
  PlanOptions planOptions;
};

ExitCode Load(const std::string& dir, const Options& options) {
  if (options.plan) return PlanLoad(dir, options.planOptions);
  if (options.allOrNothing) return LoadAllOrNothing(dir);
  return LoadFrom("load", dir, SecPolicy::LoadPolicy, options.timing);
}

Action Define(Syntax& syntax) {
  const auto dir = AddPolicyDir(syntax, SecPolicy::kPolicyRoot);
  const auto options = std::make_shared<Options>();
  const Option plan = syntax.AddFlag("--plan", options->plan,
                                     "Only show what the load would change; -v shows every file");
  syntax.AddFormat(options->planOptions.format, "the plan", {"text", "json"}).Need(plan);
  const Option allOrNothing =
      syntax
          .AddFlag("--all-or-nothing", options->allOrNothing,
                   "Load only when a rehearsal ends well, and put everything back when the load "
                   "does not")
          .Exclude(plan);
  AddTiming(syntax, options->timing).Exclude(plan).Exclude(allOrNothing);
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
    "are always those of /etc/zorvan/secpolicy. What is installed and in no file any more stays.\n"
    "With --plan the load is rehearsed on a copy of what is installed: it shows what it would\n"
    "change and which problems it would have, and changes nothing. Exit status as of the load.\n"
    "With --all-or-nothing the load is rehearsed in the same way, and done only when that ends\n"
    "well; when it then fails or is interrupted, rules, objects and file labels are put back as\n"
    "they were just before it. What others change while it runs is lost then.\n"
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
