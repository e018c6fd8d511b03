#include "module/module_status.h"

#include <sys/utsname.h>
#include <unistd.h>

#include <charconv>
#include <filesystem>
#include <fstream>
#include <map>
#include <system_error>

#include "host/enforce/module/module_maps.h"
#include "host/linux/common/module_library.h"
#include "host/linux/kernel/module_publication.h"
#include "host/linux/operation/state_use.h"
#include "policy/installed_policy.h"
#include "root.h"

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

// Where there are no pins, there is nothing to load a library for.
void ReadRunning(ModuleStatus& status) {
  if (!status.isWanted && access(Enforce::kModulePins, F_OK) != 0) return;
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

bool IsOfMachine() { return PlacesOfRoot().empty() && LinuxHost::IsStateAtUsualPlace(); }

std::string Describe(const ModuleKernel& kernel) {
  std::string text = "Linux " + kernel.release;
  if (!kernel.runsPrograms) return text + ", which does not tell its security modules";
  return text + (*kernel.runsPrograms ? ", with bpf among" : ", without bpf among") +
         " its security modules";
}

std::string Processes(std::size_t count) {
  return std::to_string(count) + (count == 1 ? " process" : " processes");
}

std::string Describe(const KeptDomain& domain) {
  return Processes(domain.processes) + ", " + std::to_string(domain.refused) + " refused, " +
         std::to_string(domain.passed) + " let pass";
}

std::vector<Json::Member> MembersOf(const ModuleStatus& status) {
  Json domains = Json::Array();
  for (const KeptDomain& domain : status.domains) {
    domains.Append({{"name", domain.name},
                    {"level", TextOf(domain.level)},
                    {"processes", domain.processes},
                    {"refused", domain.refused},
                    {"passed", domain.passed}});
  }
  Json runsPrograms;
  if (status.kernel.runsPrograms) runsPrograms = *status.kernel.runsPrograms;
  return {{"kernel", status.kernel.release}, {"runsPrograms", runsPrograms},
          {"running", status.isRunning},     {"refusing", status.isRefusing},
          {"published", status.isPublished}, {"domains", domains}};
}

ModuleStatus ReadModuleStatus() {
  ModuleStatus status;
  status.isWanted = LinuxHost::IsStateOfModule();
  status.kernel = ReadModuleKernel();
  try {
    ReadRunning(status);
  } catch (const Braxo::Lib::BraxoException& failure) {
    status.problem = failure.what();
  }
  return status;
}

KeptDomain SumOf(const std::vector<KeptDomain>& domains) {
  KeptDomain sum;
  for (const KeptDomain& domain : domains) {
    sum.processes += domain.processes;
    sum.refused += domain.refused;
    sum.passed += domain.passed;
  }
  return sum;
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
