#include "host/enforce/module/file_maps.h"

#include <bpf/bpf.h>
#include <linux/membarrier.h>
#include <sys/random.h>
#include <sys/syscall.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <map>
#include <tuple>
#include <vector>

#include "host/enforce/module/hash_map.h"
#include "host/enforce/module/mounts.h"
#include "host/enforce/module/path_hash.h"

namespace Enforce {
namespace {

// Keys with their values, as they are written.
template <class Key, class Value>
struct Batch {
  std::vector<Key> keys;
  std::vector<Value> values;

  void Add(const Key& key, const Value& value) {
    keys.push_back(key);
    values.push_back(value);
  }

  void Write(const FileDescriptor& map, const char* failure) const {
    auto count = static_cast<__u32>(keys.size());
    if (count == 0) return;
    Require(bpf_map_update_batch(map.Number(), keys.data(), values.data(), &count, nullptr) == 0,
            failure);
  }
};

// Until here all programs have ended that ran when this was called.
void AwaitPrograms() {
  Require(syscall(SYS_membarrier, MEMBARRIER_CMD_GLOBAL, 0, 0) == 0,
          "cannot wait for the programs");
}

// The entries that domains go by.
std::vector<bool> UsedEntries(const ModuleMaps& maps) {
  std::vector<bool> used(std::size_t{kDomainEntries} * kEntriesOfDomain);
  for (unsigned int domain = 0; domain < kDomainEntries; ++domain) {
    if (maps.LevelOf(domain) != kLevelAbsent) used[maps.EntryOf(domain)] = true;
  }
  return used;
}

template <class Key, class Value>
std::vector<Key> UnusedKeys(const FileDescriptor& map, const std::vector<bool>& used) {
  std::vector<Key> unused;
  ForEach<Key, Value>(map, [&](const Key& key, const Value&) {
    if (!used[key.entry]) unused.push_back(key);
  });
  return unused;
}

template <class Key>
void Remove(const FileDescriptor& map, const std::vector<Key>& keys, const char* failure) {
  auto count = static_cast<__u32>(keys.size());
  if (count == 0) return;
  Require(bpf_map_delete_batch(map.Number(), keys.data(), &count, nullptr) == 0, failure);
}

template <class Key, class Value>
void RemoveUnused(const FileDescriptor& map, const std::vector<bool>& used) {
  Remove(map, UnusedKeys<Key, Value>(map, used), "cannot remove rules");
}

ModuleFile KeyOf(const TardiskFile& file) {
  return {file.inode, DeviceNumber(major(file.device), minor(file.device)), file.generation};
}

struct ByNumbers {
  bool operator()(const ModuleFile& one, const ModuleFile& other) const {
    return std::tie(one.inode, one.device, one.generation) <
           std::tie(other.inode, other.device, other.generation);
  }
};

}  // namespace

void ChooseHashing(const ModuleMaps& maps) {
  ModuleHashing how = {};
  Require(getrandom(&how, sizeof(how), 0) == sizeof(how), "cannot have random numbers");
  how.multiplier |= 1;
  // Each step doubles the number of bits that are right, of which there are three at first.
  how.inverse = how.multiplier;
  for (int step = 0; step < 5; ++step) how.inverse *= 2 - how.multiplier * how.inverse;
  const __u32 only = 0;
  Require(bpf_map_update_elem(maps.hashing.Number(), &only, &how, BPF_ANY) == 0,
          "cannot write how paths are hashed");
}

void WriteFileRules(const ModuleMaps& maps, const ModulePlan& plan) {
  const __u32 only = 0;
  ModuleHashing how = {};
  Require(bpf_map_lookup_elem(maps.hashing.Number(), &only, &how) == 0,
          "cannot read how paths are hashed");
  // Who was killed here may have left some.
  RemoveUnusedFileRules(maps);
  Batch<ModuleLabelKey, ModuleLabelRules> labels;
  Batch<ModulePathKey, __u32> paths;
  for (const ModuleDomain& domain : plan) {
    const __u32 entry = maps.NextEntryOf(domain.id);
    for (const auto& [label, rules] : domain.files.labels) labels.Add({entry, label}, rules);
    for (const auto& [path, said] : domain.files.paths) paths.Add({HashOf(path, how), entry}, said);
  }
  labels.Write(maps.labelRules, "cannot write rules about labels");
  paths.Write(maps.paths, "cannot write rules about paths");
  // What was decided by the rules that were here before these holds no longer.
  maps.BeginEpoch();
}

void RemoveUnusedFileRules(const ModuleMaps& maps) {
  AwaitPrograms();
  const std::vector<bool> used = UsedEntries(maps);
  RemoveUnused<ModuleLabelKey, ModuleLabelRules>(maps.labelRules, used);
  RemoveUnused<ModulePathKey, __u32>(maps.paths, used);
}

void WriteTardiskFiles(const ModuleMaps& maps, const TardiskFiles& files) {
  std::map<ModuleFile, __u32, ByNumbers> missing;
  for (const TardiskFile& file : files) missing[KeyOf(file)] = file.label;
  std::vector<ModuleFile> others;
  ForEach<ModuleFile, __u32>(maps.tardiskFiles, [&](const ModuleFile& file, __u32 label) {
    const auto same = missing.find(file);
    if (same == missing.end()) {
      others.push_back(file);
    } else if (same->second == label) {
      missing.erase(same);
    }
  });
  Remove(maps.tardiskFiles, others, "cannot remove files of tardisks");
  Batch<ModuleFile, __u32> batch;
  for (const auto& [file, label] : missing) batch.Add(file, label);
  batch.Write(maps.tardiskFiles, "cannot write files of tardisks");
}

}  // namespace Enforce
