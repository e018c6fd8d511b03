#include "bundle/signature.h"
#include "bundle/trusted_keys.h"
#include "command_line.h"
#include "dry_run/planned_load.h"
#include "load/bundle_load.h"
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
  BundleChoice bundle;
};

LoadRequest RequestFor(const std::string& dir, const Options& options) {
  LoadRequest load = FullLoad(dir);
  load.keep = options.keep;
  load.allOrNothing = options.allOrNothing;
  load.timing = options.timing;
  return load;
}

ExitCode Load(const std::string& dir, const Options& options) {
  const bool isBundle = !options.bundle.file.empty();
  if (!isBundle) {
    if (const auto refusal = RefuseMissingDir("load", dir)) return *refusal;
  }
  LoadRequest load = RequestFor(dir, options);
  if (options.plan) {
    return isBundle ? PlanBundle(options.bundle, load, options.planOptions)
                    : PlanLoad(load, options.planOptions);
  }
  JournalledLoad journal(load.verb, dir);
  load.watcher = &journal;
  return isBundle ? LoadBundle(options.bundle, load) : RunLoad(load);
}

void AddBundle(Syntax& syntax, const Option& dir, BundleChoice& choice) {
  const Option bundle =
      syntax
          .AddOption("--bundle", choice.file,
                     "A signed bundle that becomes the host's policy directory, all or nothing")
          .NameValue("FILE")
          .Exclude(dir);
  syntax.BeforeRoot(bundle, LoadSignatures);
  syntax
      .AddList("--key", choice.keys,
               std::string("A public key of who signs it, in PEM; without it those in ") +
                   kTrustedKeysDir)
      .NameValue("FILE")
      .Need(bundle);
  syntax
      .AddFlag("--allow-older", choice.allowOlder,
               "Take a bundle that is older than what is installed, or of another policy")
      .Need(bundle);
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  const auto dir = std::make_shared<std::string>(SecPolicy::kPolicyRoot);
  const Option dirOption =
      syntax.AddOption("DIR", *dir, "The policy directory, as seen from the root").ShowDefault();
  const Option plan = syntax.AddFlag("--plan", options->plan,
                                     "Only show what the load would change; -v shows every file");
  syntax.AddFormat(options->planOptions.format, "the plan", {"text", "json"}).Need(plan);
  syntax
      .AddFlag("--all-or-nothing", options->allOrNothing,
               "Install and label nothing when there is any error; a bundle is always loaded so")
      .Exclude(plan);
  AddKeep(syntax, options->keep);
  AddTiming(syntax, options->timing).Exclude(plan);
  AddBundle(syntax, dirOption, options->bundle);
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
    "With --bundle the files of a signed bundle take the place of /etc/zorvan/secpolicy and are\n"
    "loaded, all or nothing: a load that fails puts the files of before back. What was there is\n"
    "kept in /etc/zorvan/secpolicy.previous, and what was edited there is named. A bundle has to\n"
    "be newer than the one before it. The policy of tardisks is theirs and stays.\n"
    "\n"
    "Examples:\n"
    "  secpolicy load                       install the host's policy again after an edit\n"
    "  secpolicy --root /srv/r load -v      the same below /srv/r, and show the progress\n"
    "  secpolicy load /root/new-policy      objects, domains and labels of another directory\n"
    "  secpolicy load --timing              how long does each phase take?\n"
    "  secpolicy load --plan                what would change? -v shows every file\n"
    "  secpolicy load --all-or-nothing      never half a policy\n"
    "  secpolicy load --bundle web.bundle   the policy of many hosts, as it was signed",
    Define};

}  // namespace SecPolicyCli
