#include "entry.h"

#include <exception>
#include <iostream>

#include "broker.h"
#include "domain_plan.h"
#include "host/linux/operation/world_entry.h"
#include "launcher.h"
#include "observe/permissive.h"
#include "observe/watch.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// Tells what this kernel cannot refuse, which is only of interest where something is to be refused;
// true where it is given up for.
bool MaySurrender(const std::string& verb, const Enforce::CompiledPlan& compiled,
                  const EntryOptions& options) {
  if (compiled.plan.level != Policy::Level::kEnforcing || KeepsAllRules(compiled)) return true;
  for (const std::string& gap : compiled.gaps) std::cerr << Enforce::LineOfGap(gap) << '\n';
  for (const Enforce::RuleFate& fate : NotExpressible(compiled.fates)) {
    std::cerr << Visible(LineOf(fate)) << '\n';
  }
  if (options.bestEffort) return true;
  std::cerr << "secpolicy: " << verb << ": the rules of " << compiled.plan.domain
            << " cannot be kept to, so nothing was started; change them, or give --best-effort"
            << std::endl;
  return false;
}

}  // namespace

void AddEntryOptions(Syntax& syntax, EntryOptions& options) {
  syntax.AddFlag("--best-effort", options.bestEffort,
                 "Start it although this kernel cannot refuse all that the rules do");
}

void PrepareEntry() {
  OpenLauncher();
  OpenProc();
}

ExitCode EnterDomain(const std::string& verb,
                     const std::function<Entry(SecPolicy::TeskAccessInterfaceImpl&)>& find,
                     const EntryOptions& options) {
  try {
    SecPolicy::TeskAccessInterfaceImpl access;
    const Entry entry = find(access);
    const Enforce::CompiledPlan compiled = PlanOf(entry.domain, access);
    if (!MaySurrender(verb, compiled, options)) return kNotConfined;
    LinuxHost::EnterWorld(compiled.plan.domainId, compiled.plan.level);
    std::cerr << std::flush;
    if (compiled.plan.level == Policy::Level::kPermissive) {
      return RunPermissive(verb, entry.domain, entry.command, entry.program, access);
    }
    StartConfined(compiled.plan, entry, KeepBroker(compiled));
  } catch (const std::exception& failure) {
    std::cerr << "secpolicy: " << verb << ": " << Visible(failure.what()) << "; nothing was started"
              << std::endl;
    return kNotConfined;
  }
}

}  // namespace SecPolicyCli
