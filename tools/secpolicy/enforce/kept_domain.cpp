#include "kept_domain.h"

#include <linux/capability.h>
#include <unistd.h>

#include <utility>

#include "domain_plan.h"
#include "ending.h"
#include "host/enforce/features.h"
#include "host/enforce/kernel.h"
#include "host/linux/common/module_library.h"
#include "host/linux/kernel/module_publication.h"
#include "host/linux/operation/contention.h"
#include "module/module_status.h"

namespace SecPolicyCli {
namespace {

// To filter system calls without giving up new privileges.
bool MayFilter() {
  Enforce::Kernel::Capabilities own;
  return Enforce::Kernel::GetCapabilities(&own) == 0 &&
         Enforce::Kernel::HasCapability(own.effective, CAP_SYS_ADMIN);
}

// Whoever has just committed may be about to tell it.
bool IsPublishedSoon(const Enforce::RunningModule& module) {
  constexpr int kMostTries = 8;
  for (int tries = 1; tries <= kMostTries; ++tries) {
    if (LinuxHost::IsPublishedTo(module)) return true;
    LinuxHost::LetOthersGoFirst(tries);
  }
  return LinuxHost::IsPublishedTo(module);
}

std::vector<Enforce::RuleFate> FatesOf(const Policy::InstalledDomain& domain) {
  return LinuxHost::ModuleLibrary().fates(domain);
}

}  // namespace

Keeper FindKeeper() {
  if (geteuid() != 0 || !IsOfMachine() || !LinuxHost::IsStateOfModule()) return {};
  if (!MayFilter()) return {nullptr, "this process lacks cap_sys_admin"};
  LinuxHost::PublishCommitted();
  auto module = LinuxHost::ModuleLibrary().find();
  if (module == nullptr) return {nullptr, "the module does not run any more"};
  if (!IsPublishedSoon(*module)) {
    return {nullptr, "the module keeps another policy than is installed"};
  }
  if (!module->IsRefusing()) return {nullptr, "the kernel does not run the module's programs"};
  return {std::move(module), ""};
}

void TellWhyNot(const std::string& verb, const Keeper& keeper, const std::string& domain) {
  if (keeper.whyNot.empty()) return;
  Summarize(verb,
            "the launcher alone confines what is started in " + domain + ": " + keeper.whyNot);
}

Enforce::CompiledPlan PlanOf(const Policy::InstalledDomain& domain, const Keeper& keeper,
                             SecPolicy::TeskAccessInterfaceImpl& access) {
  if (keeper.module == nullptr) return PlanOf(domain, access);
  return CompileBesideModule(domain, FatesOf(domain), Enforce::ProbeFeatures());
}

std::string ExplanationOf(const Policy::InstalledDomain& domain, const Keeper& keeper,
                          SecPolicy::TeskAccessInterfaceImpl& access) {
  if (keeper.module == nullptr) return ExplanationOf(domain, access);
  return ExplainBesideModule(domain, FatesOf(domain), Enforce::ProbeFeatures());
}

}  // namespace SecPolicyCli
