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

static __always_inline struct mount* mount_of(__u64 mount) {
  return (struct mount*)(mount - bpf_core_field_offset(struct mount, mnt));
}

static __always_inline struct mnt_namespace* current_namespace(void) {
  struct task_struct* thread = bpf_get_current_task_btf();
  return BPF_CORE_READ(thread, nsproxy, mnt_ns);
}

// A walk from the end of a path towards the root. First it finds the hash of the path, which is of
// what leads to it the multiple, and its last name added to that; and then the longest leading part
// that rules name.
struct PathWalk {
  struct mount* mount;
  struct dentry* entry;
  struct ModulePathKey key;
  __u64 basis;
  __u64 factor;  // from one part of the path to the next
  __u64 weight;  // of the next name in the hash; 0 when that is known, and parts are looked up
  __u32 found;
  bool is_next;  // whether this part of the path was not looked up yet
  bool is_named;
};

// Whether rules name this part.
static __always_inline bool look_up(struct PathWalk* walk, __u32 steps) {
  __u32* said = bpf_map_lookup_elem(&paths, &walk->key);
  if (!said) return false;
  if (!steps) walk->found = *said & kPathIsAboveRule;
  if (!(*said & kPathHasRule)) return false;
  walk->found |= *said & ~kPathIsAboveRule;
  return true;
}

static __always_inline long leave_mount(struct PathWalk* walk, struct mount* mount) {
  walk->mount = BPF_CORE_READ(mount, mnt_parent);
  walk->entry = BPF_CORE_READ(mount, mnt_mountpoint);
  walk->is_named = walk->mount == mount;
  if (walk->is_named) walk->key.hash += walk->basis * walk->weight;
  return walk->is_named ? kEnd : kGoOn;
}

static long step(__u32 steps, struct PathWalk* walk) {
  if (walk->is_next && look_up(walk, steps)) return kEnd;
  struct mount* mount = walk->mount;
  struct dentry* entry = walk->entry;
  walk->is_next = false;
  if (entry == BPF_CORE_READ(mount, mnt.mnt_root)) return leave_mount(walk, mount);
  walk->entry = BPF_CORE_READ(entry, d_parent);
  if (walk->entry == entry) return kEnd;
  __u64 name =
      hash_of_name((__u64)BPF_CORE_READ(entry, d_name.name), BPF_CORE_READ(entry, d_name.len));
  walk->is_next = !walk->weight;
  walk->key.hash =
      walk->weight ? walk->key.hash + name * walk->weight : (walk->key.hash - name) * walk->factor;
  walk->weight *= walk->factor;
  return kGoOn;
}

// What the rules of the entry say of a path from the root of the mount namespace on. It is without
// a name in another namespace, unless it may be in any. Stands in for the one of shared.bpf.h.
__weak __noinline __u32 find_path(__u64 mount, __u64 entry, __u64 rules_entry, __u64 is_in_any) {
  return NO_NAME;
}

static __always_inline __u32 look_for_path(__u64 mount, __u64 entry, __u64 rules_entry,
                                           __u64 is_in_any) {
  struct mount* mounted = mount_of(mount);
  struct ModuleHashing* how = how_to_hash();
  if (!how) return NO_NAME;
  struct PathWalk walk = {.mount = mounted,
                          .entry = (struct dentry*)entry,
                          .key = {0, rules_entry},
                          .basis = how->basis,
                          .factor = how->multiplier,
                          .weight = 1};
  if (!is_in_any && BPF_CORE_READ(mounted, mnt_ns) != current_namespace()) return NO_NAME;
  bpf_loop(MOST_STEPS, step, &walk, 0);
  if (!walk.is_named) return NO_NAME;
  walk.mount = mounted;
  walk.entry = (struct dentry*)entry;
  walk.factor = how->inverse;
  walk.weight = 0;
  walk.is_next = true;
  bpf_loop(MOST_STEPS, step, &walk, 0);
  return walk.found;
}

// What the rules of the entry say of a file, or of one that is to be made.
static __always_inline __u32 path_bits(__u64 mount, __u64 entry, __u32 rules_entry) {
  return find_path(mount, entry, rules_entry, 0);
}

// The same of a file that is there, in whichever mount namespace.
static __always_inline __u32 path_bits_anywhere(__u64 mount, __u64 entry, __u32 rules_entry) {
  return find_path(mount, entry, rules_entry, 1);
}

#endif
