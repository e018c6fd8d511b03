#include "host/linux/boot.h"

#include "host/linux/archive_library.h"
#include "kitlibs/file.h"
#include "library_call.h"
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

void BootAndLoad() {
  LinuxHost::Boot();
  LoadEarly();
  SecPolicy::LoadPolicy(SecPolicy::kPolicyRoot);
}

ExitCode Boot() {
  if (!File_IsDirectory(SecPolicy::kTardiskImagesDir)) {
    return Refuse("boot", std::string("there is no directory ") + SecPolicy::kTardiskImagesDir +
                              " below this root, so nothing was changed. Put the tardisks there, "
                              "or name the root that they are in (--root DIR).");
  }
  return CallLibrary("boot", SecPolicy::kPolicyRoot, BootAndLoad, AdviseOnPrivilege);
}

Action Define(CLI::App&) { return Boot; }

}  // namespace

const Verb kBoot = {
    "boot", "Unpack the tardisks, label every file, and install the policy",
    "Starts from an empty state: unpacks every archive of /tardisks/ into the root, in byte order\n"
    "of name, gives every file the label 'unlabeled', and then does what load-early and load do.\n"
    "A root without /etc/zorvan/secpolicy/early is booted without an early policy.\n"
    "It writes into the root that it is given, so try it on a root of your own first.\n"
    "\n"
    "Example:\n"
    "  mkdir -p r/tardisks && cp base.tgz r/tardisks/\n"
    "  secpolicy --root ./r boot",
    Define, LinuxHost::LoadArchiveLibrary};

}  // namespace SecPolicyCli
