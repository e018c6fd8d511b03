#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/enforce/module/entry_point.h"
#include "json.h"
#include "policy/level.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// What this kernel is, and whether it runs programs at its security hooks.
struct ModuleKernel {
  std::string release;
  std::string securityModules;       // as the kernel lists them; empty where it cannot be told
  std::optional<bool> runsPrograms;  // whether bpf is among them; nothing where it cannot be told
};

ModuleKernel ReadModuleKernel();

// A domain as the module keeps it.
struct KeptDomain {
  std::string name;
  Policy::Level level = Policy::Level::kEnforcing;
  std::size_t processes = 0;
  std::uint64_t refused = 0;  // since the module was started
  std::uint64_t passed = 0;   // what was not refused as the domain is permissive
};

struct ModuleStatus {
  ModuleKernel kernel;
  bool isWanted = false;  // it was started for what is installed
  std::string problem;    // why it cannot be told whether the module runs; empty when it can
  bool isRunning = false;
  bool isRefusing = false;   // tried anew
  bool isPublished = false;  // it was told all that is installed
  std::vector<KeptDomain> domains;

  bool IsWell() const { return isRunning && isRefusing && isPublished; }
};

// True where it is about the machine itself: below no other root, and with no state of its own.
bool IsOfMachine();

// "Linux RELEASE, with bpf among its security modules".
std::string Describe(const ModuleKernel& kernel);

// "1 process", "2 processes".
std::string Processes(std::size_t count);

// "2 processes, 3 refused, 0 let pass".
std::string Describe(const KeptDomain& domain);

// For programs: all but the schema.
std::vector<Json::Member> MembersOf(const ModuleStatus& status);

// Throws what the host throws. What the module does not tell is in `problem`. What is asked takes a
// process for a moment, unless the module does not run.
ModuleStatus ReadModuleStatus();

// All of them together, without a name.
KeptDomain SumOf(const std::vector<KeptDomain>& domains);

// The domains that are installed, as `running` keeps them.
std::vector<KeptDomain> ReadKeptDomains(const Enforce::RunningModule& running,
                                        SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
