#include "host/linux/state/kept_worlds.h"

#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <filesystem>
#include <memory>
#include <system_error>

#include "host/linux/common/host_error.h"
#include "host/linux/common/module_library.h"
#include "host/linux/common/process.h"
#include "host/linux/state/module_place.h"

namespace LinuxHost {
namespace {

using Enforce::RunningModule;

// What is counted for all domains in turn is of one moment, and for each alone it would be a walk
// over all processes.
constexpr std::chrono::milliseconds kRecent{100};

// 0 for a name that is none of a process.
int ProcessOf(const std::string& name) {
  int process = 0;
  const char* const end = name.data() + name.size();
  return std::from_chars(name.data(), end, process).ptr == end ? process : 0;
}

// Who has ended is in none.
std::optional<unsigned int> DomainIn(const RunningModule& module, int process) {
  try {
    return module.DomainOf(process);
  } catch (const Braxo::Lib::BraxoException&) {
    if (IsAlive(process)) throw;
    return std::nullopt;
  }
}

}  // namespace

KeptWorlds::KeptWorlds(const std::string& state) : mark(ModuleMarkOf(state)) {}

std::unique_ptr<RunningModule> KeptWorlds::FindKeeper() const {
  return access(mark.c_str(), F_OK) == 0 ? ModuleLibrary().find() : nullptr;
}

std::map<int, unsigned int> KeptWorlds::Read() const {
  std::map<int, unsigned int> found;
  const auto module = FindKeeper();
  if (module == nullptr) return found;
  std::error_code error;
  for (const auto& entry : std::filesystem::directory_iterator("/proc", error)) {
    const int process = ProcessOf(entry.path().filename());
    if (process <= 0) continue;
    if (const auto domain = DomainIn(*module, process)) found.emplace(process, *domain);
  }
  if (error)
    throw HostError(error.value(), "Unable to look for processes in domains without /proc");
  return found;
}

const std::map<int, unsigned int>& KeptWorlds::ReadRecent() {
  const auto now = std::chrono::steady_clock::now();
  if (now - readAt < kRecent) return recent;
  recent = Read();
  readAt = now;
  return recent;
}

std::optional<unsigned int> KeptWorlds::FindDomainOf(int process) const {
  const auto module = FindKeeper();
  return module == nullptr ? std::nullopt : DomainIn(*module, process);
}

}  // namespace LinuxHost
