#pragma once

#include <string>
#include <vector>

#include "dry_run/planned_load.h"
#include "load/load_run.h"
#include "verb.h"

namespace SecPolicyCli {

// Which bundle is to become the host's policy, and who vouches for it.
struct BundleChoice {
  std::string file;
  std::vector<std::string> keys;  // files; none: those that the host trusts
  bool allowOlder = false;        // and another policy
};

// Verifies the bundle, puts it in place of the host's policy, and loads that as `load` says, all or
// nothing: what cannot be loaded on a copy is not put there, and after a load that fails the policy
// of before is back. Throws Refusal for a bundle that is not to be taken, BraxoException, and
// std::runtime_error when there can be no copy; nothing was changed then.
ExitCode LoadBundle(const BundleChoice& choice, LoadRequest load);

// Only shows what that would change.
ExitCode PlanBundle(const BundleChoice& choice, LoadRequest load, PlanOptions options);

}  // namespace SecPolicyCli
