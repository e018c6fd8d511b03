// In which domain who is, and which rules count there.
#ifndef DOMAIN_BPF_H
#define DOMAIN_BPF_H

#include "kernel_types.bpf.h"
// What the types are needed for.
#include <asm-generic/errno.h>
#include <bpf/bpf_helpers.h>
#include <bpf/bpf_tracing.h>
#include <stdbool.h>

#include "host/enforce/module/map_entries.h"

// That of a process that is in none.
enum { kNoDomain = 1U << 31 };

struct {
  __uint(type, BPF_MAP_TYPE_ARRAY);
  __uint(map_flags, BPF_F_MMAPABLE);
  __type(key, __u32);
  __type(value, __u64);
  __uint(max_entries, kDomainEntries);
} domains SEC(".maps");

struct {
  __uint(type, BPF_MAP_TYPE_ARRAY);
  __type(key, __u32);
  __type(value, struct ModuleRules);
  __uint(max_entries, kDomainEntries* kEntriesOfDomain);
} rules SEC(".maps");

// Of the first thread of a process, by which all others go.
struct {
  __uint(type, BPF_MAP_TYPE_TASK_STORAGE);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, int);
  __type(value, struct ModuleTask);
} tasks SEC(".maps");

struct {
  __uint(type, BPF_MAP_TYPE_ARRAY);
  __type(key, __u32);
  __type(value, __u64);
  __uint(max_entries, 1);
} generation SEC(".maps");

// Nothing for who is in no domain.
static __always_inline struct ModuleTask* task_of(struct task_struct* thread) {
  return bpf_task_storage_get(&tasks, thread->group_leader, 0, 0);
}

static __always_inline struct ModuleTask* current_task(void) {
  return task_of(bpf_get_current_task_btf());
}

// That of the current process. The kernel looks through such a function once for all that call it
// in a program.
__noinline __u32 current_domain(void) {
  struct ModuleTask* task = current_task();
  return task ? task->domain : kNoDomain;
}

static __always_inline __u64 word_of(__u32 domain) {
  __u64* word = bpf_map_lookup_elem(&domains, &domain);
  return word ? *(volatile __u64*)word : kLevelAbsent;
}

static __always_inline __u32 level_of(__u64 word) { return word & kLevelMask; }

static __always_inline bool has_paths(__u64 word) { return word & kDomainHasPaths; }

// Null of a domain that there is not.
static __always_inline struct ModuleRules* rules_of(__u64 word) {
  if (level_of(word) == kLevelAbsent) return 0;
  __u32 entry = word >> kEntryShift;
  return bpf_map_lookup_elem(&rules, &entry);
}

static __always_inline bool is_enforced(__u32 level) {
  return level != kLevelPermissive && level != kLevelDisabled;
}

#endif
