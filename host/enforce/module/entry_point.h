#pragma once

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/module/map_entries.h"
#include "host/enforce/module/tardisk_file.h"
#include "policy/installed_policy.h"

namespace Enforce {

// The running module, for whoever does not link it: what module.h says of each holds here.
class RunningModule {
 public:
  RunningModule() = default;
  RunningModule(const RunningModule&) = delete;
  RunningModule& operator=(const RunningModule&) = delete;
  virtual ~RunningModule() = default;

  virtual void Publish(const Policy::InstalledPolicy& policy, const TardiskFiles& files,
                       std::uint64_t generation) = 0;
  virtual std::uint64_t Generation() const = 0;
  virtual bool IsRefusing() const = 0;
  virtual void Place(pid_t process, unsigned int domain) = 0;
  virtual int EnteringMap() const = 0;
  virtual std::optional<unsigned int> DomainOf(pid_t process) const = 0;
  virtual ModuleRefusals RefusalsIn(unsigned int domain) const = 0;
};

// What libsecpolicy-module.so offers, as its symbol SecPolicyModule. Everything throws
// Braxo::Lib::BraxoException.
struct ModuleFunctions {
  std::unique_ptr<RunningModule> (*start)();

  // Null where none runs.
  std::unique_ptr<RunningModule> (*find)();

  void (*stop)();

  // What becomes of the rules of a domain, in order, where the module alone keeps them.
  std::vector<RuleFate> (*fates)(const Policy::InstalledDomain& domain);
};

}  // namespace Enforce
