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

void Store(std::uint64_t& word, std::uint64_t entry, unsigned int level) {
  std::atomic_ref(word).store(entry << kEntryShift | level, std::memory_order_release);
}

// Of a domain's two entries the one that its rules are in.
std::uint64_t EntryOf(std::uint64_t& word) {
  return std::atomic_ref(word).load(std::memory_order_acquire) >> kEntryShift;
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
}

void ModuleMaps::MapWords() {
  void* const memory =
      mmap(nullptr, kBytesOfWords, PROT_READ | PROT_WRITE, MAP_SHARED, domains.Number(), 0);
  Require(memory != MAP_FAILED, "cannot map the levels of domains");
  words = static_cast<std::uint64_t*>(memory);
}

void ModuleMaps::Write(unsigned int domain, const ModuleRules& newRules, unsigned int level) {
  const std::uint64_t first = std::uint64_t{domain} * kEntriesOfDomain;
  const auto unused = static_cast<__u32>(EntryOf(words[domain]) == first ? first + 1 : first);
  Require(bpf_map_update_elem(rules.Number(), &unused, &newRules, BPF_ANY) == 0,
          "cannot write rules");
  Store(words[domain], unused, level);
}

void ModuleMaps::WriteLevel(unsigned int domain, unsigned int level) {
  Store(words[domain], EntryOf(words[domain]), level);
}

void ModuleMaps::Place(pid_t process, unsigned int domain) const {
  const FileDescriptor pidfd(syscall(SYS_pidfd_open, process, 0));
  const int number = pidfd.Number();
  const ModuleTask task = {domain};
  if (!pidfd.IsOpen() || bpf_map_update_elem(tasks.Number(), &number, &task, BPF_ANY) != 0)
    ThrowModuleError(StrCat("cannot place process ", process));
}

}  // namespace Enforce
