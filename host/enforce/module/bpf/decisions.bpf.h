// What was decided about files, for who opens them again.
#ifndef DECISIONS_BPF_H
#define DECISIONS_BPF_H

#include "asker.bpf.h"
#include "paths.bpf.h"

enum { kDecisionBits = 16 };

// The rights that rules give to a file, in the bits of kAllUses, and by what they have been found,
// hashed. By the highest bits of that each has its place, where the latest one stays.
struct {
  __uint(type, BPF_MAP_TYPE_ARRAY);
  __type(key, __u32);
  __type(value, __u64);
  __uint(max_entries, 1 << kDecisionBits);
} decisions SEC(".maps");

// Of all that the path of a file depends on beside its directory. Of an entry that is given another
// name the sequence goes on.
static __always_inline __u64 tag_of_name(__u64 tag, const struct path* path,
                                         struct ModuleHashing* how) {
  struct dentry* entry = path->dentry;
  struct nsproxy* spaces = bpf_get_current_task_btf()->nsproxy;
  if (!spaces) return 0;
  struct mnt_namespace* space = spaces->mnt_ns;
  if (!space || !space->event) return 0;
  // Pointers are only calculated with as differences.
  tag = mix(tag, (char*)path->mnt - (char*)how, how->multiplier);
  tag = mix(tag, (char*)space - (char*)how, how->multiplier);
  tag = mix(tag, space->event, how->multiplier);
  tag = mix(tag, (char*)entry - (char*)how, how->multiplier);
  tag = mix(tag, entry->d_seq.seqcount.sequence, how->multiplier);
  return mix(tag, (__u64)entry->d_name.hash << 32 | entry->d_name.len, how->multiplier);
}

// Of all that a decision about a file depends on where no rule is about paths; 0 where that cannot
// be told. The epoch has been read before the rules were: they are written anew in another one.
static __always_inline __u64 tag_of_file(struct dentry* entry, __u32 rules_entry, __u64 now,
                                         struct ModuleHashing* how) {
  struct inode* directory = entry->d_parent->d_inode;
  struct inode* inode = entry->d_inode;
  if (!directory || !inode) return 0;
  __u64 generation = directory->i_generation;
  // Another file system that lies where this one does begins another epoch.
  __u32 system = (char*)inode->i_sb - (char*)how;
  __u64 tag = mix(how->basis, now, how->multiplier);
  tag = mix(tag, directory->i_ino, how->multiplier);
  tag = mix(tag, inode->i_ino, how->multiplier);
  tag = mix(tag, generation << 32 | inode->i_generation, how->multiplier);
  return mix(tag, (__u64)system << 32 | rules_entry, how->multiplier);
}

static __always_inline __u64 tag_of_decision(const struct path* path, __u64 word, __u64 now,
                                             struct ModuleHashing* how) {
  __u64 tag = tag_of_file(path->dentry, word >> kEntryShift, now, how);
  if (tag && has_paths(word)) tag = tag_of_name(tag, path, how);
  return tag & ~(__u64)kAllUses;
}

static __always_inline __u64* decision_by(__u64 tag) {
  __u32 place = tag >> (64 - kDecisionBits);
  return bpf_map_lookup_elem(&decisions, &place);
}

static __always_inline bool was_granted(__u64 tag, __u32 wanted) {
  __u64* decision = decision_by(tag);
  if (!decision || !tag) return false;
  __u64 made = *(volatile __u64*)decision;
  return (made & ~(__u64)kAllUses) == tag && !(wanted & ~made);
}

static __always_inline void remember_rights(__u64 tag, __u32 rights) {
  __u64* decision = decision_by(tag);
  if (decision && tag) *(volatile __u64*)decision = tag | (rights & kAllUses);
}

#endif
