#include "host/linux/operation/boot.h"

#include <iostream>
#include <limits>

#include "boot/boot_plan.h"
#include "braxo/lib/exception.h"
#include "command_line.h"
#include "ending.h"
#include "host/linux/operation/archive_library.h"
#include "host/linux/operation/mend_state.h"
#include "kitlibs/file.h"
#include "load/load_run.h"
#include "monitor/journal.h"
#include "policy_dir.h"
#include "root.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/policy_root.h"
#include "text/format.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// A root whose services all start after the full load needs no early policy.
void LoadEarly(const std::string& directory, SecPolicy::PolicyObserver& observer) {
  if (File_IsDirectory(directory.c_str())) return SecPolicy::LoadPolicyEarly(directory, observer);
  SecPolicy::SecpolicyInfo(std::string("No early policy: there is no directory ") +
                           SecPolicy::kEarlyPolicyRoot);
}

struct Options {
  bool timing = false;
  bool plan = false;
  std::string format = "text";
  std::vector<std::string> policyFrom;
  bool showAll = false;
};

LinuxHost::TardiskRules RulesOf(const Options& options) {
  return {.policyRoot = SecPolicy::kPolicyRoot,
          .policyTardisks = {options.policyFrom.begin(), options.policyFrom.end()}};
}

// More fill a screen without telling more.
std::size_t MostShown(const Options& options) {
  constexpr std::size_t kMostShown = 10;
  return options.showAll ? std::numeric_limits<std::size_t>::max() : kMostShown;
}

// A boot is the way out of every damage.
void Mend() {
  const std::string mended = LinuxHost::MendState();
  if (!mended.empty()) Summarize("boot", mended);
}

ExitCode BootNow(const Options& options) {
  LinuxHost::AssembledRoot root;
  JournalledLoad journal("boot", SecPolicy::kPolicyRoot);
  return RunLoad(
      {.verb = "boot",
       .policyDir = SecPolicy::kPolicyRoot,
       .steps = {{LinuxHost::LoadKind::kEarly, SecPolicy::kEarlyPolicyRoot, LoadEarly},
                 {LinuxHost::LoadKind::kFull, SecPolicy::kPolicyRoot, SecPolicy::LoadPolicy}},
       .timing = options.timing,
       .watcher = &journal,
       .mend = Mend,
       .prepare =
           [&](LoadTiming& phases) {
             root =
                 LinuxHost::AssembleRoot(RulesOf(options), [&] { phases.EndPhase("unpacking"); });
             WriteSection("edited files that were replaced", root.editedFiles, MostShown(options),
                          std::cerr);
             phases.EndPhase("first labels");
           },
       .begin = [&] { LinuxHost::StartPolicy(root); }});
}

ExitCode Plan(const Options& options) {
  const LinuxHost::BootPlan plan = LinuxHost::PlanBoot(RulesOf(options));
  if (options.format == "json") {
    WriteBootPlanJson(plan, std::cout);
  } else {
    WriteBootPlanText(plan, MostShown(options), std::cout);
  }
  Summarize("boot", "this was a plan: nothing was changed");
  return kWell;
}

ExitCode RefuseWithoutTardisks() {
  const std::string missing = std::string("there is no directory ") + SecPolicy::kTardiskImagesDir +
                              " below this root, so nothing was changed. Put the tardisks there";
  if (File_IsDirectory(SecPolicy::kPolicyRoot)) {
    return Refuse("boot", missing + ", or make it empty for a host without any.");
  }
  return Refuse("boot", missing + ", or name the root that they are in (--root DIR). " +
                            Call("init") + " writes a first policy, for a host without any.");
}

ExitCode Boot(const Options& options) {
  if (!File_IsDirectory(SecPolicy::kTardiskImagesDir)) return RefuseWithoutTardisks();
  return options.plan ? Plan(options) : BootNow(options);
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  const Option plan = syntax.AddFlag("--plan", options->plan,
                                     "Only show what would become of files; -v shows them all");
  syntax.AddFormat(options->format, "the plan", {"text", "json"}).Need(plan);
  AddTiming(syntax, options->timing).Exclude(plan);
  syntax
      .AddList("--policy-from", options->policyFrom,
               "Let the tardisk NAME bring the policy of the host; may be repeated")
      .NameValue("NAME")
      .Offer(OfferTardisks());
  const Option verbose = syntax.Verbose();
  return [=] {
    options->showAll = verbose.IsGiven();
    return Boot(*options);
  };
}

}  // namespace

const Verb kBoot = {
    "boot", "Unpack the tardisks, label every file, and install the policy",
    "Checks every archive of /tardisks/ to its last byte, unpacks them into the root, in byte "
    "order\n"
    "of name, gives every file the label 'unlabeled', and then, from an empty state, does what\n"
    "load-early and load do. An archive that is damaged or brings what it may not ends the boot\n"
    "before anything was changed. No archive may bring the policy in /etc/zorvan/secpolicy but "
    "for\n"
    "its tardisks/; --policy-from names one that may, and whose makers are then trusted with all.\n"
    "Files that somebody has edited since they were unpacked are replaced and named.\n"
    "A root without /etc/zorvan/secpolicy/early is booted without an early policy.\n"
    "It writes into the root that it is given, so try it on a root of your own first.\n"
    "\n"
    "Examples:\n"
    "  mkdir -p r/tardisks && cp base.tgz r/tardisks/\n"
    "  secpolicy --root ./r boot\n"
    "  secpolicy --root ./r boot --plan     which files would it add, replace and label?\n"
    "  secpolicy --root ./r boot --timing   how long does each phase take?",
    Define, LinuxHost::LoadArchiveLibrary};

}  // namespace SecPolicyCli
