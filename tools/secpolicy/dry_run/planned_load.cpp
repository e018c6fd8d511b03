#include "planned_load.h"

#include <iostream>
#include <limits>

#include "ending.h"
#include "host/linux/operation/log_use.h"
#include "load_plan.h"
#include "policy_dir.h"

namespace SecPolicyCli {
namespace {

// More files fill a screen without telling more.
constexpr std::size_t kShownLabels = 20;

}  // namespace

ExitCode PlanLoad(const LoadRequest& load, const PlanOptions& options) {
  const LoadDryRun dryRun(load);
  if (dryRun.Ending() != kWell) std::cerr << dryRun.Messages() << std::flush;
  const LinuxHost::DroppedLog dropped;
  const LoadPlan plan = MakeLoadPlan(dryRun);
  if (options.format == "json") {
    WritePlanJson(plan, load.policyDir, options.bundle, dryRun, std::cout);
  } else {
    const auto all = std::numeric_limits<std::size_t>::max();
    WritePlanText(plan, options.showAll ? all : kShownLabels, std::cout);
  }
  Summarize("load", plan.ChangesNothing() ? "nothing would change"
                                          : "this was a plan: nothing was changed");
  return dryRun.Ending();
}

}  // namespace SecPolicyCli
