// All that libsecpolicy-module.so shows. Found by its name, which C++ would decorate.
#include "host/enforce/module/entry_point.h"

#include <utility>

#include "host/enforce/kernel.h"
#include "host/enforce/module/module.h"

namespace Enforce {
namespace {

unsigned int LastCapability() { return static_cast<unsigned int>(Kernel::LastCapability()); }

class Running : public RunningModule {
 public:
  explicit Running(Module found) : module(std::move(found)) {}

  void Publish(const Policy::InstalledPolicy& policy, const TardiskFiles& files,
               std::uint64_t generation) override {
    // What was mounted since, and what was made since.
    module.LearnLabels();
    module.WriteLabels();
    module.TellTardiskFiles(files);
    module.Publish(PlanModule(policy.domains, LastCapability(), policy.objects), generation);
  }
  std::uint64_t Generation() const override { return module.Generation(); }
  bool IsRefusing() const override { return module.IsRefusing(); }
  void Place(pid_t process, unsigned int domain) override { module.Place(process, domain); }
  int EnteringMap() const override { return module.EnteringMap(); }
  std::optional<unsigned int> DomainOf(pid_t process) const override {
    return module.DomainOf(process);
  }
  ModuleRefusals RefusalsIn(unsigned int domain) const override {
    return module.RefusalsIn(domain);
  }

 private:
  Module module;
};

std::unique_ptr<RunningModule> Start() { return std::make_unique<Running>(Module::Start()); }

std::unique_ptr<RunningModule> Find() {
  auto found = Module::FindRunning();
  return found ? std::make_unique<Running>(std::move(*found)) : nullptr;
}

std::vector<RuleFate> Fates(const Policy::InstalledDomain& domain) {
  return FatesByModule(domain, LastCapability());
}

}  // namespace
}  // namespace Enforce

extern "C" __attribute__((visibility("default"))) const Enforce::ModuleFunctions SecPolicyModule = {
    Enforce::Start, Enforce::Find, Enforce::Module::Stop, Enforce::Fates};
