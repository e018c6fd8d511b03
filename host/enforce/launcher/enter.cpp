#include "host/enforce/launcher/enter.h"

#include <sys/prctl.h>
#include <sys/random.h>
#include <unistd.h>

#include <algorithm>
#include <limits>
#include <utility>

#include "host/enforce/kernel.h"
#include "host/enforce/launcher/masking.h"
#include "host/enforce/launcher/privileges.h"
#include "host/enforce/launcher/refuse.h"
#include "host/enforce/launcher/ruleset.h"
#include "host/enforce/launcher/startable.h"

namespace Enforce {
namespace {

// What was opened outside is no right of the domain, and no rule is asked about it again.
void CloseAllBut(std::vector<int> kept) {
  std::ranges::sort(kept);
  unsigned int first = STDERR_FILENO + 1;
  for (const int descriptor : kept) {
    const auto number = static_cast<unsigned int>(descriptor);
    if (number < first) continue;
    if (number > first && close_range(first, number - 1, 0) != 0) {
      RefuseForErrno("cannot close the descriptors of the caller");
    }
    first = number + 1;
  }
  if (close_range(first, std::numeric_limits<unsigned int>::max(), 0) != 0) {
    RefuseForErrno("cannot close the descriptors of the caller");
  }
}

void Restrict(int ruleset) {
  if (prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0) {
    RefuseForErrno("cannot give up new privileges");
  }
  if (ruleset >= 0 && Kernel::RestrictSelf(ruleset) != 0) {
    RefuseForErrno("cannot restrict files, ports and signals by Landlock");
  }
}

std::uint64_t MakeSecret() {
  std::uint64_t secret = 0;
  if (getrandom(&secret, sizeof(secret), 0) != sizeof(secret)) {
    RefuseForErrno("cannot get random bytes");
  }
  return secret;
}

// Returns the secret that lets the program start.
std::uint64_t FilterCalls(Plan* plan) {
  if (plan->filter.empty()) return 0;
  const std::uint64_t secret = MakeSecret();
  if (plan->secret) SetSecret(plan->filter.data(), *plan->secret, secret);
  if (Kernel::SetFilter(plan->filter.data(), plan->filter.size()) != 0) {
    RefuseForErrno("cannot filter system calls");
  }
  return secret;
}

// What is asked for counts from the program on, so that nothing of this process is judged by the
// rules of the domain.
void AskModule(int module, const Plan& plan) {
  if (Kernel::EnterWithNextProgram(module, plan.domainId) != 0) {
    RefuseForErrno("cannot ask the module for the domain " + plan.domain);
  }
  close(module);
}

}  // namespace

void Enter(Plan plan, const Program& program, std::vector<int> keptDescriptors) {
  const std::string failure = "cannot execute " + program.path;
  if (plan.level != Policy::Level::kEnforcing) {
    Start(program, 0);
    RefuseForErrno(failure);
  }
  RequireStartable(plan, program);
  if (program.descriptor >= 0) keptDescriptors.push_back(program.descriptor);
  CloseAllBut(keptDescriptors);
  keptDescriptors.insert(keptDescriptors.end(), {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO});
  // Asked first: in a user namespace of one's own one has them all.
  const std::uint64_t kept = plan.capabilities & OwnCapabilities();
  ApplyMasks(plan.masks, keptDescriptors);
  const int ruleset = PrepareRuleset(plan);
  std::string refusal = PrepareRefusal(failure + " in the domain " + plan.domain);
  KeepCapabilities(kept);
  Restrict(ruleset);
  const std::uint64_t secret = FilterCalls(&plan);
  Start(program, secret);
  RefuseForErrno(std::move(refusal), secret);
}

void EnterInModule(Plan plan, const Program& program, int module) {
  const bool isFiltered = plan.level == Policy::Level::kEnforcing;
  if (isFiltered) {
    RequireStartable(plan, program);
    std::vector<int> kept = {module};
    if (program.descriptor >= 0) kept.push_back(program.descriptor);
    CloseAllBut(std::move(kept));
  }
  AskModule(module, plan);
  std::string refusal =
      PrepareRefusal("cannot execute " + program.path + " in the domain " + plan.domain);
  const std::uint64_t secret = isFiltered ? FilterCalls(&plan) : 0;
  Start(program, secret);
  RefuseForErrno(std::move(refusal), secret);
}

}  // namespace Enforce
