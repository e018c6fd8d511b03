#include "policy_dir.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/secpolicy.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

Action Define(Syntax& syntax) {
  const auto dir = AddPolicyDir(syntax, SecPolicy::kEarlyPolicyRoot);
  const auto timing = std::make_shared<bool>(false);
  AddTiming(syntax, *timing);
  return [=] { return LoadFrom("load-early", *dir, SecPolicy::LoadPolicyEarly, *timing); };
}

}  // namespace

const Verb kLoadEarly = {
    "load-early", "Install the small policy that early boot needs",
    "Installs the domains of the early policy directory, and the objects and the file labels of\n"
    "/etc/zorvan/secpolicy. The first failure ends the load.\n"
    "\n"
    "Example:\n"
    "  secpolicy load-early                 what a boot script runs before the first services",
    Define};

}  // namespace SecPolicyCli
