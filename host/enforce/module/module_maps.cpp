#include "host/enforce/module/module_maps.h"

#include <bpf/bpf.h>
#include <bpf/libbpf.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <vector>

#include "braxo/lib/exception.h"
#include "braxo/misc/strcat.h"

using Braxo::Misc::StrCat;

namespace Enforce {
namespace {

constexpr std::size_t kBytesOfWords = kDomainEntries * sizeof(std::uint64_t);

void Store(std::uint64_t& word, std::uint64_t value) {
  std::atomic_ref(word).store(value, std::memory_order_release);
}

std::uint64_t Load(std::uint64_t& word) {
  return std::atomic_ref(word).load(std::memory_order_acquire);
}

template <class Value>
Value* Map(const FileDescriptor& map, std::size_t size, const char* failure) {
  void* const memory = mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_SHARED, map.Number(), 0);
  Require(memory != MAP_FAILED, failure);
  return static_cast<Value*>(memory);
}

}  // namespace

void ThrowModuleError(const std::string& what) {
  const char* const why = strerror(errno);
  throw Braxo::Lib::BraxoException(StrCat("the module: ", what, ": ", why));
}

void Require(bool isDone, const char* what) {
  if (!isDone) ThrowModuleError(what);
}

std::string PinOf(const char* name) { return StrCat(kModulePins, "/", name); }

FileDescriptor OpenPinned(const char* name) {
  const std::string path = PinOf(name);
  FileDescriptor map(bpf_obj_get(path.c_str()));
  Require(map.IsOpen(), path.c_str());
  return map;
}

ModuleRefusals SumOf(const FileDescriptor& refusals, unsigned int domain) {
  const int processors = libbpf_num_possible_cpus();
  Require(processors > 0, "cannot count processors");
  std::vector<ModuleRefusals> counts(static_cast<std::size_t>(processors));
  Require(bpf_map_lookup_elem(refusals.Number(), &domain, counts.data()) == 0,
          "cannot read what was refused");
  ModuleRefusals all = {};
  for (const ModuleRefusals& one : counts) {
    all.refused += one.refused;
    all.passed += one.passed;
    all.untold += one.untold;
  }
  return all;
}

ModuleMaps::~ModuleMaps() {
  if (words != nullptr) munmap(words, kBytesOfWords);
  if (hashed != nullptr) munmap(hashed, sizeof(*hashed));
}

void ModuleMaps::MapWords() {
  words = Map<std::uint64_t>(domains, kBytesOfWords, "cannot map the levels of domains");
  hashed = Map<ModuleHashing>(hashing, sizeof(*hashed), "cannot map the epoch");
}

void ModuleMaps::BeginEpoch() const { std::atomic_ref(hashed->epoch).fetch_add(1); }

__u32 ModuleMaps::EntryOf(unsigned int domain) const {
  return static_cast<__u32>(Load(words[domain]) >> kEntryShift);
}

__u32 ModuleMaps::NextEntryOf(unsigned int domain) const {
  const __u32 first = domain * kEntriesOfDomain;
  return EntryOf(domain) == first ? first + 1 : first;
}

unsigned int ModuleMaps::LevelOf(unsigned int domain) const {
  return static_cast<unsigned int>(Load(words[domain]) & kLevelMask);
}

void ModuleMaps::Write(unsigned int domain, const ModuleRules& newRules, unsigned int level) {
  const __u32 unused = NextEntryOf(domain);
  Require(bpf_map_update_elem(rules.Number(), &unused, &newRules, BPF_ANY) == 0,
          "cannot write rules");
  const std::uint64_t hasPaths = newRules.hasPaths != 0 ? kDomainHasPaths : 0;
  Store(words[domain], static_cast<std::uint64_t>(unused) << kEntryShift | hasPaths | level);
}

void ModuleMaps::WriteLevel(unsigned int domain, unsigned int level) {
  const std::uint64_t others = Load(words[domain]) & ~std::uint64_t{kLevelMask};
  Store(words[domain], others | level);
}

void ModuleMaps::Place(pid_t process, unsigned int domain) const {
  const FileDescriptor pidfd(syscall(SYS_pidfd_open, process, 0));
  const int number = pidfd.Number();
  const ModuleTask task = {domain, 0};
  if (!pidfd.IsOpen() || bpf_map_update_elem(tasks.Number(), &number, &task, BPF_ANY) != 0)
    ThrowModuleError(StrCat("cannot place process ", process));
}

}  // namespace Enforce
