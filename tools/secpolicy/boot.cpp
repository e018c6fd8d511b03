#include "host/linux/boot.h"

#include "host/linux/archive_library.h"
#include "kitlibs/file.h"
#include "library_call.h"
#include "load_summary.h"
#include "load_timing.h"
#include "policy_dir.h"
#include "root.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/secpolicy.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// A root whose services all start after the full load needs no early policy.
void LoadEarly() {
  if (File_IsDirectory(SecPolicy::kEarlyPolicyRoot)) {
    return SecPolicy::LoadPolicyEarly(SecPolicy::kEarlyPolicyRoot);
  }
  SecPolicy::SecpolicyInfo(std::string("No early policy: there is no directory ") +
                           SecPolicy::kEarlyPolicyRoot);
}

void BootAndLoad(LoadTiming& timing) {
  LinuxHost::StartPolicy(
      LinuxHost::AssembleRoot({.policyRoot = SecPolicy::kPolicyRoot, .policyTardisks = {}}));
  timing.EndPhase("first labels");
  timing.BeginPart("early ");
  LoadEarly();
  EndEarlyLoad();
  timing.BeginPart("");
  SecPolicy::LoadPolicy(SecPolicy::kPolicyRoot);
}

ExitCode Boot(bool timing) {
  if (!File_IsDirectory(SecPolicy::kTardiskImagesDir)) {
    return Refuse("boot", std::string("there is no directory ") + SecPolicy::kTardiskImagesDir +
                              " below this root, so nothing was changed. Put the tardisks there, "
                              "or name the root that they are in (--root DIR).");
  }
  return CallLibrary(
      "boot", SecPolicy::kPolicyRoot,
      [&] {
        LoadTiming phases(timing);
        BootAndLoad(phases);
      },
      AdviseOnPrivilege, DescribeInstalled);
}

Action Define(Syntax& syntax) {
  const auto timing = std::make_shared<bool>(false);
  AddTiming(syntax, *timing);
  return [timing] { return Boot(*timing); };
}

}  // namespace

const Verb kBoot = {
    "boot", "Unpack the tardisks, label every file, and install the policy",
    "Starts from an empty state: unpacks every archive of /tardisks/ into the root, in byte order\n"
    "of name, gives every file the label 'unlabeled', and then does what load-early and load do.\n"
    "A root without /etc/zorvan/secpolicy/early is booted without an early policy.\n"
    "It writes into the root that it is given, so try it on a root of your own first.\n"
    "\n"
    "Examples:\n"
    "  mkdir -p r/tardisks && cp base.tgz r/tardisks/\n"
    "  secpolicy --root ./r boot\n"
    "  secpolicy --root ./r boot --timing   how long does each phase take?",
    Define, LinuxHost::LoadArchiveLibrary};

}  // namespace SecPolicyCli
