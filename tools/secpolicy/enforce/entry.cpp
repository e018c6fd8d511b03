#include "entry.h"

#include <iostream>

#include "domain_plan.h"
#include "host/linux/operation/world_entry.h"
#include "launcher.h"
#include "text/format.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// What cannot be refused is only of interest where something is to be refused.
std::vector<Enforce::RuleFate> Surrendered(const Enforce::CompiledPlan& compiled) {
  if (compiled.plan.level != Policy::Level::kEnforcing) return {};
  return NotExpressible(compiled.fates);
}

// Tells what this kernel cannot refuse; true where it is given up for.
bool MaySurrender(const std::string& verb, const Enforce::CompiledPlan& compiled,
                  const EntryOptions& options) {
  const std::vector<Enforce::RuleFate> surrendered = Surrendered(compiled);
  for (const Enforce::RuleFate& fate : surrendered) {
    std::cerr << Visible(FateText(fate)) << '\n';
  }
  if (surrendered.empty() || options.bestEffort) return true;
  std::cerr << "secpolicy: " << verb << ": " << CountOf(surrendered.size(), "rule") << " of "
            << compiled.plan.domain
            << " cannot be kept to, so nothing was started; change them, or give --best-effort"
            << std::endl;
  return false;
}

}  // namespace

void AddEntryOptions(Syntax& syntax, EntryOptions& options) {
  syntax.AddFlag("--best-effort", options.bestEffort,
                 "Start it although this kernel cannot refuse all that the rules do");
}

ExitCode EnterDomain(
    const std::string& verb,
    const std::function<std::string(SecPolicy::TeskAccessInterfaceImpl&)>& findDomain,
    const std::vector<std::string>& command, const EntryOptions& options) {
  try {
    SecPolicy::TeskAccessInterfaceImpl access;
    const Enforce::CompiledPlan compiled = PlanOf(findDomain(access), access);
    if (!MaySurrender(verb, compiled, options)) return kNotConfined;
    LinuxHost::EnterWorld(compiled.plan.domainId);
    std::cerr << std::flush;
    StartConfined(compiled.plan, command);
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << "secpolicy: " << verb << ": " << Visible(failure.what()) << "; nothing was started"
              << std::endl;
    return kNotConfined;
  }
}

}  // namespace SecPolicyCli
