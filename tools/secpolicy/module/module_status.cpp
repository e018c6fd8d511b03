#include "module/module_status.h"

#include <sys/utsname.h>
#include <unistd.h>

#include <charconv>
#include <filesystem>
#include <fstream>
#include <map>
#include <system_error>

#include "host/linux/kernel/module_publication.h"
#include "host/linux/operation/state_use.h"
#include "policy/installed_policy.h"

namespace SecPolicyCli {
namespace {

// 0 for a name that is none of a process.
pid_t ProcessOf(const std::string& name) {
  pid_t process = 0;
  const char* const end = name.data() + name.size();
  return std::from_chars(name.data(), end, process).ptr == end ? process : 0;
}

// Nothing for one that is in none, or has ended meanwhile.
std::optional<unsigned int> FindDomainOf(pid_t process, const Enforce::RunningModule& running) {
  try {
    return running.DomainOf(process);
  } catch (const Braxo::Lib::BraxoException&) {
    return std::nullopt;
  }
}

std::map<unsigned int, std::size_t> CountProcesses(const Enforce::RunningModule& running) {
  std::map<unsigned int, std::size_t> counts;
  std::error_code unreadable;
  for (const auto& entry : std::filesystem::directory_iterator("/proc", unreadable)) {
    const pid_t process = ProcessOf(entry.path().filename());
    if (process <= 0) continue;
    if (const auto domain = FindDomainOf(process, running)) ++counts[*domain];
  }
  return counts;
}

void ReadRunning(ModuleStatus& status) {
  const auto running = LinuxHost::ModuleLibrary().find();
  if (running == nullptr) return;
  status.isRunning = true;
  status.isRefusing = running->IsRefusing();
  if (LinuxHost::IsStateMissing()) return;
  status.isPublished = LinuxHost::IsPublishedTo(*running);
  SecPolicy::TeskAccessInterfaceImpl access;
  status.domains = ReadKeptDomains(*running, access);
}

}  // namespace

ModuleKernel ReadModuleKernel() {
  ModuleKernel kernel;
  utsname names{};
  if (uname(&names) == 0) kernel.release = names.release;
  std::ifstream file("/sys/kernel/security/lsm");
  if (!std::getline(file, kernel.securityModules)) return kernel;
  kernel.runsPrograms = ("," + kernel.securityModules + ",").find(",bpf,") != std::string::npos;
  return kernel;
}

ModuleStatus ReadModuleStatus() {
  ModuleStatus status;
  status.kernel = ReadModuleKernel();
  try {
    ReadRunning(status);
  } catch (const Braxo::Lib::BraxoException& failure) {
    status.problem = failure.what();
  }
  return status;
}

std::vector<KeptDomain> ReadKeptDomains(const Enforce::RunningModule& running,
                                        SecPolicy::TeskAccessInterfaceImpl& access) {
  const std::map<unsigned int, std::size_t> processes = CountProcesses(running);
  std::vector<KeptDomain> kept;
  for (const Policy::InstalledDomain& domain : Policy::ListDomains(access)) {
    const Enforce::ModuleRefusals refusals = running.RefusalsIn(domain.id);
    const auto found = processes.find(domain.id);
    kept.push_back({domain.name, domain.level, found == processes.end() ? 0 : found->second,
                    refusals.refused, refusals.passed});
  }
  return kept;
}

}  // namespace SecPolicyCli
