// In which domain who is, and what is refused there.
#ifndef DOMAIN_BPF_H
#define DOMAIN_BPF_H

#include "kernel_types.bpf.h"
// What the types are needed for.
#include <asm-generic/errno.h>
#include <bpf/bpf_helpers.h>
#include <bpf/bpf_tracing.h>
#include <stdbool.h>

#include "host/enforce/module/map_entries.h"

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
  __uint(type, BPF_MAP_TYPE_PERCPU_ARRAY);
  __type(key, __u32);
  __type(value, struct ModuleRefusals);
  __uint(max_entries, kDomainEntries);
} refusals SEC(".maps");

struct {
  __uint(type, BPF_MAP_TYPE_ARRAY);
  __type(key, __u32);
  __type(value, __u64);
  __uint(max_entries, 1);
} generation SEC(".maps");

// For whoever reads it. What there is no room for is only counted.
struct {
  __uint(type, BPF_MAP_TYPE_RINGBUF);
  __uint(max_entries, kBytesOfEvents);
} events SEC(".maps");

// What somebody asks for; its detail and value are of its kind.
struct ModuleAct {
  __u32 kind;
  __u32 detail;
  __u64 value;
};

static __always_inline struct ModuleAct act(__u32 kind, __u32 detail, __u64 value) {
  struct ModuleAct asked = {kind, detail, value};
  return asked;
}

// Nothing for who is in no domain.
static __always_inline struct ModuleTask* task_of(struct task_struct* thread) {
  return bpf_task_storage_get(&tasks, thread->group_leader, 0, 0);
}

static __always_inline struct ModuleTask* current_task(void) {
  return task_of(bpf_get_current_task_btf());
}

static __always_inline __u64 word_of(__u32 domain) {
  __u64* word = bpf_map_lookup_elem(&domains, &domain);
  return word ? *(volatile __u64*)word : kLevelAbsent;
}

static __always_inline __u32 level_of(__u64 word) { return (__u32)word; }

// What has no rules has all zeroes.
static __always_inline struct ModuleRules* rules_of(__u64 word) {
  __u32 entry = word >> kEntryShift;
  return bpf_map_lookup_elem(&rules, &entry);
}

static __always_inline void count(__u32 domain, bool is_refused) {
  struct ModuleRefusals* counts = bpf_map_lookup_elem(&refusals, &domain);
  if (!counts) return;
  if (is_refused)
    counts->refused++;
  else
    counts->passed++;
}

static __always_inline bool is_enforced(__u32 level) {
  return level != kLevelPermissive && level != kLevelDisabled;
}

static __always_inline void tell(__u32 domain, bool is_refused, struct ModuleAct asked) {
  struct ModuleEvent* event = bpf_ringbuf_reserve(&events, sizeof(*event), 0);
  if (!event) return;
  event->time = bpf_ktime_get_boot_ns();
  event->value = asked.value;
  event->process = bpf_get_current_pid_tgid() >> 32;
  event->domain = domain;
  event->act = asked.kind;
  event->detail = asked.detail;
  event->isRefused = is_refused;
  bpf_get_current_comm(event->program, sizeof(event->program));
  bpf_ringbuf_submit(event, 0);
}

// What comes of an act that the rules of a domain of this level refuse.
static __always_inline int refuse(__u32 domain, __u32 level, struct ModuleAct asked) {
  if (level == kLevelDisabled) return 0;
  count(domain, is_enforced(level));
  tell(domain, is_enforced(level), asked);
  return is_enforced(level) ? -EPERM : 0;
}

// What no rule can grant to who is in a domain.
static __always_inline int refuse_in_any_domain(void) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  return refuse(task->domain, level_of(word_of(task->domain)), act(kActReachModule, 0, 0));
}

#endif
