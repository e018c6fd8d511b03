#include "policy_dir.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/secpolicy.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

Action Define(CLI::App& app) {
  const auto dir = AddPolicyDir(app, SecPolicy::kPolicyRoot);
  return [dir] { return LoadFrom("load", *dir, SecPolicy::LoadPolicy); };
}

}  // namespace

const Verb kLoad = {
    "load", "Install the full policy",
    "Installs objects, domains, partner domains, tardisk policy and file labels, in this order.\n"
    "A part that fails is reported and the next one is loaded. Tardisk policy and partner domains\n"
    "are always those of /etc/zorvan/secpolicy.\n"
    "\n"
    "Examples:\n"
    "  secpolicy load                       install the host's policy again after an edit\n"
    "  secpolicy --root /srv/r load -v      the same below /srv/r, and show the progress\n"
    "  secpolicy load /root/new-policy      objects, domains and labels of another directory",
    Define};

}  // namespace SecPolicyCli
