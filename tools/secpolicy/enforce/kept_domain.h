#pragma once

#include <memory>
#include <string>

#include "host/enforce/compile.h"
#include "host/enforce/module/entry_point.h"
#include "secpolicy/secpolicy.h"

// Domains that the module keeps for the whole machine, and so confines what is started in them.
namespace SecPolicyCli {

// The module, where it was told all that is installed and this process may put itself into its
// domains; else why it may not.
struct Keeper {
  std::unique_ptr<Enforce::RunningModule> module;
  std::string whyNot;  // empty where no module is to keep the state in use
};

// Throws what the host throws.
Keeper FindKeeper();

// Tells on standard error that the domain is confined by the launcher alone, where the module was
// to keep it.
void TellWhyNot(const std::string& verb, const Keeper& keeper, const std::string& domain);

// The plan by which a program is started in the domain, and the same for people: PlanOf() and
// ExplanationOf(), unless the module keeps it. Throws what the host throws.
Enforce::CompiledPlan PlanOf(const Policy::InstalledDomain& domain, const Keeper& keeper,
                             SecPolicy::TeskAccessInterfaceImpl& access);
std::string ExplanationOf(const Policy::InstalledDomain& domain, const Keeper& keeper,
                          SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
