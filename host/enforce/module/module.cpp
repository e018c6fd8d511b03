#include "host/enforce/module/module.h"

#include <bpf/bpf.h>
#include <bpf/libbpf.h>
#include <fcntl.h>
#include <linux/magic.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/vfs.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "braxo/lib/exception.h"
#include "braxo/misc/strcat.h"
#include "host/enforce/module/canary.h"
#include "host/enforce/module/file_maps.h"
#include "host/enforce/module/label_learning.h"
#include "host/enforce/module/label_writing.h"
#include "host/enforce/module/module_maps.h"
#include "host/enforce/module/program_loading.h"
#include "module_programs.skel.h"

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

namespace Enforce {
namespace {

constexpr const char* kFileSystem = "/sys/fs/bpf";
// Becomes kModulePins as a whole. That file system takes no names with dots.
constexpr const char* kNewPins = "/sys/fs/bpf/secpolicy-new";
constexpr const char* kPinOfProgram = "link_";

struct NamedMap {
  const char* name;
  FileDescriptor ModuleMaps::*map;
};
constexpr std::array kMaps = {
    NamedMap{"domains", &ModuleMaps::domains},
    NamedMap{"rules", &ModuleMaps::rules},
    NamedMap{"tasks", &ModuleMaps::tasks},
    NamedMap{"entering", &ModuleMaps::entering},
    NamedMap{"refusals", &ModuleMaps::refusals},
    NamedMap{"generation", &ModuleMaps::generation},
    NamedMap{"events", &ModuleMaps::events},
    NamedMap{"labels", &ModuleMaps::labels},
    NamedMap{"devices", &ModuleMaps::devices},
    NamedMap{"hashing", &ModuleMaps::hashing},
    NamedMap{"paths", &ModuleMaps::paths},
    NamedMap{"label_rules", &ModuleMaps::labelRules},
    NamedMap{"tardisk_files", &ModuleMaps::tardiskFiles},
};

struct Destroy {
  void operator()(module_programs* programs) const { module_programs__destroy(programs); }
};
using Programs = std::unique_ptr<module_programs, Destroy>;

unsigned int NumberOf(Policy::Level level) {
  switch (level) {
    case Policy::Level::kEnforcing:
      return kLevelEnforcing;
    case Policy::Level::kPermissive:
      return kLevelPermissive;
    case Policy::Level::kDisabled:
      break;
  }
  return kLevelDisabled;
}

void RequireDomain(unsigned int domain) {
  if (domain >= kModuleDomains)
    throw BraxoException(StrCat("the module: there is no domain ", domain));
}

void RequireFileSystem() {
  struct statfs found = {};
  Require(statfs(kFileSystem, &found) == 0, kFileSystem);
  if (found.f_type != BPF_FS_MAGIC) {
    throw BraxoException(
        "the module: no bpf file system is mounted at /sys/fs/bpf, where it would be kept");
  }
}

// The first line of a file; empty where there is none.
std::string LineOf(const char* path) {
  std::ifstream file(path);
  std::string line;
  std::getline(file, line);
  return line;
}

// For whoever cannot use the machine otherwise.
void RequireNotTurnedOff() {
  std::istringstream words(LineOf("/proc/cmdline"));
  for (std::string word; words >> word;) {
    if (word == kModuleOff) {
      throw BraxoException(
          StrCat("the module: it is turned off by ", kModuleOff, " of the kernel's command line"));
    }
  }
}

// Who locks the kernel down that far wants nobody to read its memory, as the programs do.
void RequireNotLockedDown() {
  const std::string modes = LineOf("/sys/kernel/security/lockdown");
  if (modes.find("[confidentiality]") != std::string::npos) {
    throw BraxoException(
        "the module: the kernel takes no such programs, since it is locked down "
        "(lockdown=confidentiality)");
  }
}

// The programs, and what holds functions in them that they share, which they go before.
struct Running {
  std::unordered_map<std::string, FileDescriptor> links;
  Programs programs;
};

Running LoadAndAttach() {
  libbpf_set_print(nullptr);
  ProgramLoading loading;
  Running running = {.links = {}, .programs = Programs(module_programs__open())};
  Require(running.programs != nullptr, "cannot read the programs");
  loading.Load(*running.programs->skeleton);
  running.links = loading.Share();
  Require(module_programs__attach(running.programs.get()) == 0, "cannot attach the programs");
  return running;
}

std::unique_ptr<ModuleMaps> MapsOf(module_programs& programs) {
  auto maps = std::make_unique<ModuleMaps>();
  for (const auto& [name, map] : kMaps) {
    const int number = bpf_object__find_map_fd_by_name(programs.obj, name);
    (*maps).*map = FileDescriptor(fcntl(number, F_DUPFD_CLOEXEC, 0));
    Require(((*maps).*map).IsOpen(), name);
  }
  maps->MapWords();
  return maps;
}

// Programs are loaded and attached as well where the kernel never runs them.
void RequireRefusal(ModuleMaps& maps) {
  maps.Write(kCanaryDomain, {}, kLevelEnforcing);
  if (IsRefused([](pid_t) {}))
    throw BraxoException("the module: whoever starts it needs the capability cap_setpcap");
  if (!IsRefused([&maps](pid_t child) { maps.Place(child, kCanaryDomain); })) {
    throw BraxoException(
        "the module: the kernel does not run its programs, since bpf is not among the security "
        "modules that it was started with (lsm=)");
  }
}

void Pin(const Running& running) {
  const module_programs& programs = *running.programs;
  Require(mkdir(kNewPins, 0700) == 0, kNewPins);
  for (const auto& [name, map] : kMaps) {
    const std::string path = StrCat(kNewPins, "/", name);
    Require(bpf_obj_pin(bpf_object__find_map_fd_by_name(programs.obj, name), path.c_str()) == 0,
            path.c_str());
  }
  for (const auto& [name, link] : running.links) {
    const std::string path = StrCat(kNewPins, "/", name);
    Require(bpf_obj_pin(link.Number(), path.c_str()) == 0, path.c_str());
  }
  const bpf_object_skeleton& skeleton = *programs.skeleton;
  for (int index = 0; index < skeleton.prog_cnt; ++index) {
    if (*skeleton.progs[index].link == nullptr) continue;
    const std::string path = StrCat(kNewPins, "/", kPinOfProgram, skeleton.progs[index].name);
    Require(bpf_link__pin(*skeleton.progs[index].link, path.c_str()) == 0, path.c_str());
  }
  Require(rename(kNewPins, kModulePins) == 0, kModulePins);
}

// Programs go before what they share: what stands in for that refuses.
void Remove(const char* pins) {
  std::error_code error;
  for (const auto& pin : std::filesystem::directory_iterator(pins, error)) {
    if (pin.path().filename().string().starts_with(kPinOfProgram)) unlink(pin.path().c_str());
  }
  std::filesystem::remove_all(pins, error);
  if (error)
    throw BraxoException(StrCat("the module: cannot remove ", pins, ": ", error.message()));
}

// Held by one of those that write, until it is closed or its holder is killed.
FileDescriptor LockPins() {
  FileDescriptor pins(open(kModulePins, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  Require(pins.IsOpen() && flock(pins.Number(), LOCK_EX) == 0, kModulePins);
  return pins;
}

}  // namespace

Module::Module(std::unique_ptr<ModuleMaps> those) : maps(std::move(those)) {}
Module::Module(Module&&) noexcept = default;
Module& Module::operator=(Module&&) noexcept = default;
Module::~Module() = default;

Module Module::Start() {
  RequireNotTurnedOff();
  RequireNotLockedDown();
  RequireFileSystem();
  if (std::filesystem::exists(kModulePins)) throw BraxoException("the module: it runs already");
  Remove(kNewPins);
  const Running running = LoadAndAttach();
  std::unique_ptr<ModuleMaps> maps = MapsOf(*running.programs);
  ChooseHashing(*maps);
  RequireRefusal(*maps);
  try {
    Pin(running);
  } catch (const BraxoException&) {
    Remove(kNewPins);
    throw;
  }
  return Module(std::move(maps));
}

std::optional<Module> Module::FindRunning() {
  if (access(kModulePins, F_OK) != 0) return std::nullopt;
  auto maps = std::make_unique<ModuleMaps>();
  for (const auto& [name, map] : kMaps) (*maps).*map = OpenPinned(name);
  maps->MapWords();
  return Module(std::move(maps));
}

void Module::Stop() {
  std::optional<Module> running = FindRunning();
  const FileDescriptor lock = running ? LockPins() : FileDescriptor();
  // The kernel ends programs a moment after nothing holds them.
  if (running) {
    running->WriteLabels();
    for (unsigned int id = 0; id < kDomainEntries; ++id)
      running->maps->WriteLevel(id, kLevelDisabled);
  }
  // Whoever is killed from here on has left what the next start removes.
  if (rename(kModulePins, kNewPins) != 0 && errno != ENOENT) ThrowModuleError(kModulePins);
  Remove(kNewPins);
}

void Module::Publish(const ModulePlan& plan, std::uint64_t generation) {
  const FileDescriptor lock = LockPins();
  std::vector<bool> exists(kModuleDomains);
  for (const ModuleDomain& domain : plan) {
    RequireDomain(domain.id);
    exists[domain.id] = true;
  }
  WriteFileRules(*maps, plan);
  for (const ModuleDomain& domain : plan)
    maps->Write(domain.id, domain.rules, NumberOf(domain.level));
  for (unsigned int id = 0; id < kModuleDomains; ++id) {
    if (!exists[id]) maps->WriteLevel(id, kLevelAbsent);
  }
  RemoveUnusedFileRules(*maps);
  const __u32 only = 0;
  Require(bpf_map_update_elem(maps->generation.Number(), &only, &generation, BPF_ANY) == 0,
          "cannot write the generation");
}

void Module::TellTardiskFiles(const TardiskFiles& files) {
  const FileDescriptor lock = LockPins();
  WriteTardiskFiles(*maps, files);
}

std::uint64_t Module::Generation() const {
  const __u32 only = 0;
  std::uint64_t generation = 0;
  Require(bpf_map_lookup_elem(maps->generation.Number(), &only, &generation) == 0,
          "cannot read the generation");
  return generation;
}

bool Module::IsRefusing() const {
  return IsRefused([this](pid_t child) { maps->Place(child, kCanaryDomain); });
}

void Module::SetLevel(unsigned int domain, Policy::Level level) {
  RequireDomain(domain);
  const FileDescriptor lock = LockPins();
  maps->WriteLevel(domain, NumberOf(level));
}

void Module::Place(pid_t process, unsigned int domain) {
  RequireDomain(domain);
  maps->Place(process, domain);
}

int Module::EnteringMap() const { return maps->entering.Number(); }

std::optional<unsigned int> Module::DomainOf(pid_t process) const {
  const FileDescriptor pidfd(syscall(SYS_pidfd_open, process, 0));
  const int number = pidfd.Number();
  ModuleTask task = {};
  if (pidfd.IsOpen() && bpf_map_lookup_elem(maps->tasks.Number(), &number, &task) == 0)
    return task.domain;
  if (!pidfd.IsOpen() || errno != ENOENT)
    ThrowModuleError(StrCat("cannot look up process ", process));
  return std::nullopt;
}

std::vector<UnlabelledMount> Module::LearnLabels() { return Enforce::LearnLabels(*maps); }

std::size_t Module::WriteLabels() { return Enforce::WriteLabels(*maps); }

ModuleRefusals Module::RefusalsIn(unsigned int domain) const {
  RequireDomain(domain);
  return SumOf(maps->refusals, domain);
}

}  // namespace Enforce
