#pragma once

#include <optional>
#include <string>

#include "host/enforce/plan/plan.h"
#include "host/linux/operation/state_use.h"
#include "scratch/scratch_state.h"

// Plans for users who may not read the state. Everything throws what the host throws.
namespace SecPolicyCli {

// Makes the plan of every installed domain whose rules this kernel can keep to, for all users to
// enter it by until the policy changes. Returns whether it did: it does nothing while there are
// some, for others than the superuser, who need none, and where labels were never given to files.
bool PublishPlans();

// The same for the verb `verb`, whose work is done: that there are no plans is told on standard
// error.
void PublishPlansOrTell(const std::string& verb);

// The published plan of the domain, which is of the policy as it is and of this kernel. Throws,
// with what to do, when there is none.
Enforce::Plan ReadPublishedPlan(const std::string& domain);

// As long as it lives, this process works with the state as of the published plans.
class PublishedState {
 public:
  PublishedState();

 private:
  const ScratchDirectory directory;
  std::optional<LinuxHost::UsedCopy> used;
};

}  // namespace SecPolicyCli
