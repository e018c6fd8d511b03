#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>

#include "host/enforce/module/map_entries.h"
#include "host/enforce/supervise/file_descriptor.h"

namespace Enforce {

// The maps of the running programs.
struct ModuleMaps {
  FileDescriptor domains;
  FileDescriptor rules;
  FileDescriptor tasks;
  FileDescriptor entering;
  FileDescriptor refusals;
  FileDescriptor generation;
  FileDescriptor events;
  FileDescriptor labels;
  FileDescriptor devices;
  FileDescriptor hashing;
  FileDescriptor paths;
  FileDescriptor labelRules;
  FileDescriptor tardiskFiles;
  std::uint64_t* words = nullptr;   // of the domains, as the programs see them
  ModuleHashing* hashed = nullptr;  // what is in `hashing`, likewise

  ModuleMaps() = default;
  ModuleMaps(const ModuleMaps&) = delete;
  ModuleMaps& operator=(const ModuleMaps&) = delete;
  ~ModuleMaps();

  // Makes `words` what is in `domains`, and `hashed` what is in `hashing`.
  void MapWords();

  // From here on nothing counts that programs have found out before about files.
  void BeginEpoch() const;

  // Of a domain's two entries the one that its rules are in, and the other one.
  __u32 EntryOf(unsigned int domain) const;
  __u32 NextEntryOf(unsigned int domain) const;

  // kLevelEnforcing and so on.
  unsigned int LevelOf(unsigned int domain) const;

  // Gives the domain these rules and this level (kLevelEnforcing and so on) at once.
  void Write(unsigned int domain, const ModuleRules& newRules, unsigned int level);
  void WriteLevel(unsigned int domain, unsigned int level);

  // Puts a process into a domain.
  void Place(pid_t process, unsigned int domain) const;
};

// Where programs and maps are kept while no process has them.
inline constexpr const char* kModulePins = "/sys/fs/bpf/secpolicy";

// The path of what is kept there by this name.
std::string PinOf(const char* name);

// Opens the map that is kept there. Throws where there is none.
FileDescriptor OpenPinned(const char* name);

// All that was counted in the map `refusals` for a domain.
ModuleRefusals SumOf(const FileDescriptor& refusals, unsigned int domain);

// Throws Braxo::Lib::BraxoException: "the module: WHAT: " and the system's text for errno.
[[noreturn]] void ThrowModuleError(const std::string& what);

// Throws that unless `result`, of a call, is none of a failure.
void Require(bool isDone, const char* what);

}  // namespace Enforce
