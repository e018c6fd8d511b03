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

struct {
  __uint(type, BPF_MAP_TYPE_ARRAY);
  __type(key, __u32);
  __type(value, struct ModuleHashing);
  __uint(max_entries, 1);
} hashing SEC(".maps");

static __always_inline struct ModuleHashing* how_to_hash(void) {
  __u32 only = 0;
  return bpf_map_lookup_elem(&hashing, &only);
}

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

static __always_inline int step(struct Step* at) {
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
  struct nsproxy* spaces = bpf_get_current_task_btf()->nsproxy;
  return spaces ? spaces->mnt_ns : 0;
}

// A path from its end towards the root.
struct PathSearch {
  struct Step at;
  struct ModulePathKey key;
  __u64 weight;
  __u32 found;
  bool is_named;
  bool is_next;  // whether this part of the path was not looked up yet
};

// The hash of a path: of what leads to it the multiple, and its last name added to that.
static long hash_step(__u32 index, struct PathSearch* search) {
  struct ModuleHashing* how = how_to_hash();
  int kind = step(&search->at);
  if (!how || kind == kStepNowhere) return kEnd;
  search->is_named = kind == kStepRoot;
  if (kind != kStepMount)
    search->key.hash += (kind == kStepRoot ? how->basis : search->at.hash) * search->weight;
  if (kind == kStepName) search->weight *= how->multiplier;
  return kind == kStepRoot ? kEnd : kGoOn;
}

// Looks for the longest leading part that rules name.
static long look_up_step(__u32 index, struct PathSearch* search) {
  struct ModuleHashing* how = how_to_hash();
  __u32* said = search->is_next ? bpf_map_lookup_elem(&paths, &search->key) : 0;
  if (said && !index) search->found = *said & kPathIsAboveRule;
  if (said && *said & kPathHasRule) {
    search->found |= *said & ~kPathIsAboveRule;
    return kEnd;
  }
  int kind = step(&search->at);
  search->is_next = kind == kStepName;
  if (how && search->is_next)
    search->key.hash = (search->key.hash - search->at.hash) * how->inverse;
  return how && (kind == kStepName || kind == kStepMount) ? kGoOn : kEnd;
}

// Of a path from the root of the mount namespace on; 0 where it is without a name, or in another
// namespace, unless it may be in any.
__noinline __u64 hash_of_path(__u64 mount, __u64 entry, __u64 is_in_any) {
  struct mount* mounted = mount_of(mount);
  struct PathSearch search = {.at = {mounted, (struct dentry*)entry, 0}, .weight = 1};
  if (!is_in_any && BPF_CORE_READ(mounted, mnt_ns) != current_namespace()) return 0;
  bpf_loop(MOST_STEPS, hash_step, &search, 0);
  return search.is_named ? search.key.hash : 0;
}

// What the rules of the entry say of the path that has this hash.
__noinline __u32 find_path(__u64 mount, __u64 entry, __u64 rules_entry, __u64 hash) {
  if (!hash) return NO_NAME;
  struct PathSearch search = {.at = {mount_of(mount), (struct dentry*)entry, 0},
                              .key = {hash, rules_entry},
                              .is_next = true};
  bpf_loop(MOST_STEPS, look_up_step, &search, 0);
  return search.found;
}

// Who looks for a path, and where.
struct PathQuestion {
  struct vfsmount* mount;
  struct ModuleHashing* how;
  __u64 tag;  // of all that the hash of a path depends on; 0 where that cannot be told
  __u32 entry;
};

// Pointers are only calculated with as differences.
static __always_inline __u64 tag_of(struct vfsmount* mount, struct ModuleHashing* how) {
  struct mnt_namespace* space = current_namespace();
  if (!space || !space->event) return 0;
  __u64 tag = mix(how->basis, current_epoch(), how->multiplier);
  tag = mix(tag, (char*)mount - (char*)how, how->multiplier);
  tag = mix(tag, (char*)space - (char*)how, how->multiplier);
  return mix(tag, space->event, how->multiplier);
}

static __noinline __u64 hash_of_directory(struct PathQuestion* question, struct dentry* directory,
                                          struct ModuleDirectory* known) {
  __u64 found = known ? *(volatile __u64*)&known->hash : 0;
  __u64 check = known ? *(volatile __u64*)&known->check : 0;
  __u64 multiplier = question->how->multiplier;
  if (found && question->tag && mix(question->tag, found, multiplier) == check) return found;
  found = hash_of_path(number_of(question->mount), number_of(directory), 0);
  if (known && question->tag) {
    *(volatile __u64*)&known->hash = found;
    *(volatile __u64*)&known->check = mix(question->tag, found, multiplier);
  }
  return found;
}

static __always_inline __u32 find_directory(struct PathQuestion* question, struct dentry* directory,
                                            struct ModuleDirectory* known) {
  __u64 tag = mix(question->tag, question->entry, question->how->multiplier);
  tag = tag >> kPathBits << kPathBits;
  __u32 place = question->entry % kPathsOfDirectory;
  __u64 found = known ? *(volatile __u64*)&known->paths[place] : 0;
  if (question->tag && known && found >> kPathBits << kPathBits == tag)
    return found & ((1 << kPathBits) - 1);
  found = find_path(number_of(question->mount), number_of(directory), question->entry,
                    hash_of_directory(question, directory, known));
  if (known && question->tag) *(volatile __u64*)&known->paths[place] = tag | found;
  return found;
}

// Of the path of an entry of a directory with rules beneath it.
static __always_inline __u32 find_entry(struct PathQuestion* question, struct dentry* entry,
                                        struct ModuleDirectory* known, __u32 above) {
  __u64 hash = hash_of_directory(question, entry->d_parent, known);
  if (!hash) return NO_NAME;
  hash = hash * question->how->multiplier +
         hash_of_name(number_of(entry->d_name.name), entry->d_name.len);
  struct ModulePathKey key = {hash, question->entry};
  __u32* said = bpf_map_lookup_elem(&paths, &key);
  if (said && *said & kPathHasRule) return *said;
  return (above & ~kPathIsAboveRule) | (said ? *said : 0);
}

// What the rules of the entry say of a file, or of one that is to be made.
static __noinline __u32 path_bits(struct vfsmount* mount, struct dentry* entry, __u32 rules_entry) {
  struct ModuleHashing* how = how_to_hash();
  struct inode* inode = entry->d_inode;
  bool is_itself = inode && is_directory(inode);
  struct dentry* directory = is_itself ? entry : entry->d_parent;
  if (!is_itself && entry == mount->mnt_root) {
    __u64 hash = hash_of_path(number_of(mount), number_of(entry), 0);
    return find_path(number_of(mount), number_of(entry), rules_entry, hash);
  }
  inode = directory->d_inode;
  if (!inode || !how) return NO_NAME;
  struct ModuleFile key = key_of(inode);
  struct ModuleDirectory* known = bpf_map_lookup_elem(&directories, &key);
  if (!known) known = remember(&key);
  struct PathQuestion question = {mount, how, tag_of(mount, how), rules_entry};
  __u32 found = find_directory(&question, directory, known);
  if (is_itself || !(found & kPathIsAboveRule)) return found;
  return find_entry(&question, entry, known, found);
}

// The same of a file that is there, in whichever mount namespace.
static __always_inline __u32 path_bits_anywhere(struct vfsmount* mount, struct dentry* entry,
                                                __u32 rules_entry) {
  __u64 hash = hash_of_path(number_of(mount), number_of(entry), 1);
  return find_path(number_of(mount), number_of(entry), rules_entry, hash);
}

#endif
