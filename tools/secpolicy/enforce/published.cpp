#include "published.h"

#include <unistd.h>

#include <cerrno>
#include <limits>
#include <map>
#include <utility>

#include "domain_plan.h"
#include "ending.h"
#include "host/enforce/features.h"
#include "host/enforce/plan_file.h"
#include "host/linux/common/host_error.h"
#include "host/linux/operation/contention.h"
#include "host/linux/operation/label_index.h"
#include "host/linux/operation/published_plans.h"
#include "host/linux/operation/world_records.h"
#include "policy/installed_policy.h"
#include "root.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {
namespace {

using Enforce::Features;
using LinuxHost::HostError;

// What a plan was made for: the state that has the number, and what the kernel can do.
std::string MarkOf(const std::string& serial, const Features& features) {
  return serial + " landlock=" + std::to_string(features.landlock) +
         " seccomp=" + std::to_string(features.seccomp);
}

// Plans are for any user: they keep all capabilities that rules grant, of which the launcher drops
// those that whoever enters does not have.
Features FeaturesForAnybody() {
  Features features = Enforce::ProbeFeatures();
  features.capabilities = std::numeric_limits<std::uint64_t>::max();
  return features;
}

// Nothing for a domain whose rules cannot be kept to: only root, who is told which these are, may
// enter it all the same.
std::optional<Enforce::Plan> PlanForAnybody(const Policy::InstalledDomain& domain,
                                            PlanSources& sources) {
  Enforce::CompiledPlan compiled = sources.Compile(domain);
  if (domain.level == Policy::Level::kEnforcing && !KeepsAllRules(compiled)) return std::nullopt;
  // The plan is used later, when files may be gone, and by users who may not reach all of them.
  for (Enforce::PathRight& right : compiled.plan.paths) right.mayBeMissing = true;
  return std::move(compiled.plan);
}

// False when the policy was changed meanwhile.
bool TryToPublish() {
  // Before plans are in the making: a new index is a change of the state, by which they would not
  // count any more.
  LinuxHost::RefreshLabelIndex();
  LinuxHost::PlansInTheMaking making;
  SecPolicy::TeskAccessInterfaceImpl access;
  const Features features = FeaturesForAnybody();
  PlanSources sources(access, features);
  std::map<std::string, std::string> plans;
  for (unsigned int id = 0; id < access.GetMaxDomains(); ++id) {
    const auto domain = Policy::ReadDomain(access, id);
    if (!domain) continue;
    auto plan = PlanForAnybody(*domain, sources);
    if (!plan) continue;
    plan->mark = MarkOf(making.Serial(), features);
    plans.emplace(domain->name, Enforce::Serialize(*plan));
  }
  return making.Publish(plans);
}

Enforce::Plan Verified(const std::string& domain, const std::string& bytes,
                       const std::string& serial) {
  Enforce::Plan plan;
  const char* whyNot = nullptr;
  if (!Enforce::Parse(bytes, &plan, &whyNot)) LinuxHost::RefusePublishedPlan(domain, whyNot);
  if (plan.domain != domain) LinuxHost::RefusePublishedPlan(domain, "it is of another domain");
  if (plan.mark != MarkOf(serial, Enforce::ProbeFeatures())) {
    LinuxHost::RefusePublishedPlan(domain, "it is of another policy, or for another kernel");
  }
  return plan;
}

}  // namespace

bool PublishPlans() {
  constexpr int kMostTries = 5;
  if (geteuid() != 0 || !LinuxHost::IsLabelIndexPossible()) return false;
  for (int tries = 1; tries <= kMostTries; ++tries) {
    if (LinuxHost::ArePlansPublished()) return false;
    if (TryToPublish()) return true;
    LinuxHost::LetOthersGoFirst(tries);
  }
  throw HostError(EBUSY,
                  "Unable to make plans for ordinary users: the policy changes all the time. Run " +
                      Call("load") + " again");
}

void PublishPlansOrTell(const std::string& verb) {
  try {
    PublishPlans();
  } catch (const Braxo::Lib::BraxoException& failure) {
    Summarize(verb, failure.what());
  }
}

Enforce::Plan ReadPublishedPlan(const std::string& domain) {
  std::string serial = LinuxHost::PublishedSerial();
  while (true) {
    const std::string bytes = LinuxHost::ReadPublishedPlan(domain);
    // Others may have been published between these two, and the plan be one of them.
    const std::string now = LinuxHost::PublishedSerial();
    if (now == serial) return Verified(domain, bytes, serial);
    serial = now;
  }
}

// Not in /tmp or the like, where domains are often granted to write: who can change the copy
// decides which domains this user enters.
PublishedState::PublishedState() : directory(LinuxHost::MakeOwnDirectory()) {
  const std::string serial = LinuxHost::PublishedSerial();
  const std::string copy = directory.File("host.db");
  LinuxHost::CopyPublishedState(copy);
  if (LinuxHost::PublishedSerial() != serial) {
    throw HostError(EAGAIN, "The policy has just been changed. Try it again");
  }
  used.emplace(copy, LinuxHost::ShownStatePath());
}

}  // namespace SecPolicyCli
