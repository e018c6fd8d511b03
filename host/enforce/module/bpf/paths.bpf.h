// Rules about paths. The name of a file is the one that it has from the root of the mount namespace
// on, whatever the root of the process is.
#ifndef PATHS_BPF_H
#define PATHS_BPF_H

#include "labels.bpf.h"

// More steps towards the root, over directories and mounts, no path has, or it is without a name.
#define MOST_STEPS 64
#define MOST_WORDS_OF_NAME 32

// What is without a name is refused, as by a rule that permits nothing.
#define NO_NAME kPathHasRule

struct {
  __uint(type, BPF_MAP_TYPE_HASH);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, struct ModulePathKey);
  __type(value, __u32);
  __uint(max_entries, kMostPathRules);
} paths SEC(".maps");

static __always_inline __u64 mix(__u64 hash, __u64 word, __u64 multiplier) {
  hash = (hash ^ word) * multiplier;
  return hash ^ hash >> 29;
}

struct NameSearch {
  __u64 name;
  __u64 left;
  __u64 hash;
  __u64 multiplier;
};

static long hash_word(__u32 index, struct NameSearch* search) {
  // The verifier wants to see in the end that there is room.
  __u64 words[2] = {};
  __u64 size = search->left < 8 ? search->left : 8;
  asm volatile("%0 &= 15" : "+r"(size));
  bpf_probe_read_kernel(words, size, (const void*)search->name);
  search->hash = mix(search->hash, words[0], search->multiplier);
  search->name += 8;
  search->left -= size;
  return search->left ? kGoOn : kEnd;
}

__noinline __u64 hash_of_name(__u64 name, __u32 length) {
  struct ModuleHashing* how = how_to_hash();
  if (!how) return 0;
  struct NameSearch search = {name, length, how->basis, how->multiplier};
  bpf_loop(MOST_WORDS_OF_NAME, hash_word, &search, 0);
  return search.hash;
}

// A step from an entry towards the root.
struct Step {
  struct mount* mount;
  struct dentry* entry;
  __u64 hash;  // of its name
};

enum { kStepName, kStepMount, kStepRoot, kStepNowhere };

__noinline int step(struct Step* at) {
  if (!at) return kStepNowhere;
  struct mount* mount = at->mount;
  struct dentry* entry = at->entry;
  if (entry == BPF_CORE_READ(mount, mnt.mnt_root)) {
    at->mount = BPF_CORE_READ(mount, mnt_parent);
    at->entry = BPF_CORE_READ(mount, mnt_mountpoint);
    return at->mount == mount ? kStepRoot : kStepMount;
  }
  at->entry = BPF_CORE_READ(entry, d_parent);
  if (at->entry == entry) return kStepNowhere;
  __u64 name = (__u64)BPF_CORE_READ(entry, d_name.name);
  at->hash = hash_of_name(name, BPF_CORE_READ(entry, d_name.len));
  return kStepName;
}

static __always_inline struct mount* mount_of(__u64 mount) {
  return (struct mount*)(mount - bpf_core_field_offset(struct mount, mnt));
}

static __always_inline struct mnt_namespace* current_namespace(void) {
  struct task_struct* thread = bpf_get_current_task_btf();
  return BPF_CORE_READ(thread, nsproxy, mnt_ns);
}

// A path from its end towards the root.
struct PathSearch {
  struct Step at;
  struct ModulePathKey key;
  __u64 weight;
  __u64 basis;
  __u64 factor;  // from one part of the path to the next
  __u32 found;
  bool is_named;
  bool is_next;  // whether this part of the path was not looked up yet
};

// The hash of a path: of what leads to it the multiple, and its last name added to that.
static long hash_step(__u32 index, struct PathSearch* search) {
  int kind = step(&search->at);
  if (kind == kStepNowhere) return kEnd;
  search->is_named = kind == kStepRoot;
  if (search->is_named) search->key.hash += search->basis * search->weight;
  if (kind == kStepName) {
    search->key.hash += search->at.hash * search->weight;
    search->weight *= search->factor;
  }
  return search->is_named ? kEnd : kGoOn;
}

// Looks for the longest leading part that rules name.
static long look_up_step(__u32 index, struct PathSearch* search) {
  __u32* said = search->is_next ? bpf_map_lookup_elem(&paths, &search->key) : 0;
  if (said && !index) search->found = *said & kPathIsAboveRule;
  if (said && *said & kPathHasRule) {
    search->found |= *said & ~kPathIsAboveRule;
    return kEnd;
  }
  int kind = step(&search->at);
  search->is_next = kind == kStepName;
  if (search->is_next) search->key.hash = (search->key.hash - search->at.hash) * search->factor;
  return kind == kStepName || kind == kStepMount ? kGoOn : kEnd;
}

// Of a path from the root of the mount namespace on; 0 where it is without a name, or in another
// namespace, unless it may be in any.
__noinline __u64 hash_of_path(__u64 mount, __u64 entry, __u64 is_in_any) {
  struct mount* mounted = mount_of(mount);
  struct ModuleHashing* how = how_to_hash();
  if (!how) return 0;
  struct PathSearch search = {.at = {mounted, (struct dentry*)entry, 0},
                              .weight = 1,
                              .basis = how->basis,
                              .factor = how->multiplier};
  if (!is_in_any && BPF_CORE_READ(mounted, mnt_ns) != current_namespace()) return 0;
  bpf_loop(MOST_STEPS, hash_step, &search, 0);
  return search.is_named ? search.key.hash : 0;
}

// What the rules of the entry say of the path that has this hash.
__noinline __u32 find_path(__u64 mount, __u64 entry, __u64 rules_entry, __u64 hash) {
  struct ModuleHashing* how = how_to_hash();
  if (!hash || !how) return NO_NAME;
  struct PathSearch search = {.at = {mount_of(mount), (struct dentry*)entry, 0},
                              .key = {hash, rules_entry},
                              .factor = how->inverse,
                              .is_next = true};
  bpf_loop(MOST_STEPS, look_up_step, &search, 0);
  return search.found;
}

// What the rules of the entry say of a file, or of one that is to be made.
static __always_inline __u32 path_bits(__u64 mount, __u64 entry, __u32 rules_entry) {
  return find_path(mount, entry, rules_entry, hash_of_path(mount, entry, 0));
}

// The same of a file that is there, in whichever mount namespace.
static __always_inline __u32 path_bits_anywhere(__u64 mount, __u64 entry, __u32 rules_entry) {
  return find_path(mount, entry, rules_entry, hash_of_path(mount, entry, 1));
}

#endif
