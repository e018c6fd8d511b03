// What is refused in a domain, and who is told.
#ifndef REFUSAL_BPF_H
#define REFUSAL_BPF_H

#include <bpf/bpf_core_read.h>

#include "domain.bpf.h"

struct {
  __uint(type, BPF_MAP_TYPE_PERCPU_ARRAY);
  __type(key, __u32);
  __type(value, struct ModuleRefusals);
  __uint(max_entries, kDomainEntries);
} refusals SEC(".maps");

// For whoever reads it. What there is no room for is only counted.
struct {
  __uint(type, BPF_MAP_TYPE_RINGBUF);
  __uint(max_entries, kBytesOfEvents);
} events SEC(".maps");

struct EventWithShortPath {
  struct ModuleEvent event;
  char path[kBytesOfShortPath];
};

struct EventWithPath {
  struct ModuleEvent event;
  char path[kBytesOfPath];
};

// What somebody asks for; its detail and value are of its kind.
struct ModuleAct {
  __u32 kind;
  __u32 detail;
  __u64 value;
  __u32 label;  // of a file
};

static __always_inline struct ModuleAct act(__u32 kind, __u32 detail, __u64 value) {
  struct ModuleAct asked = {kind, detail, value, kNoModuleLabel};
  return asked;
}

static __always_inline struct ModuleAct act_on_file(__u32 kind, __u32 detail, __u32 label) {
  struct ModuleAct asked = {kind, detail, 0, label};
  return asked;
}

static __noinline void describe(struct ModuleEvent* event, __u32 domain, __u32 level,
                                struct ModuleAct* asked) {
  struct task_struct* thread = bpf_get_current_task_btf();
  event->time = bpf_ktime_get_boot_ns();
  event->started = BPF_CORE_READ(thread, group_leader, start_boottime);
  event->value = asked->value;
  event->process = bpf_get_current_pid_tgid() >> 32;
  event->parent = BPF_CORE_READ(thread, real_parent, tgid);
  event->user = (__u32)bpf_get_current_uid_gid();
  event->domain = domain;
  event->act = asked->kind;
  event->detail = asked->detail;
  event->label = asked->label;
  event->isRefused = is_enforced(level);
  bpf_get_current_comm(event->program, sizeof(event->program));
}

static __always_inline bool tell(__u32 domain, __u32 level, struct ModuleAct* asked) {
  struct ModuleEvent* event = bpf_ringbuf_reserve(&events, sizeof(*event), 0);
  if (!event) return false;
  describe(event, domain, level, asked);
  bpf_ringbuf_submit(event, 0);
  return true;
}

// Most paths are short, and then many events have room.
static __always_inline bool tell_path(__u32 domain, __u32 level, struct ModuleAct* asked,
                                      struct path* path) {
  struct EventWithShortPath* event = bpf_ringbuf_reserve(&events, sizeof(*event), 0);
  if (!event) return false;
  if (bpf_d_path(path, event->path, sizeof(event->path)) > 0) {
    describe(&event->event, domain, level, asked);
    bpf_ringbuf_submit(event, 0);
    return true;
  }
  bpf_ringbuf_discard(event, 0);
  struct EventWithPath* longer = bpf_ringbuf_reserve(&events, sizeof(*longer), 0);
  if (!longer) return false;
  if (bpf_d_path(path, longer->path, sizeof(longer->path)) <= 0) longer->path[0] = 0;
  describe(&longer->event, domain, level, asked);
  bpf_ringbuf_submit(longer, 0);
  return true;
}

// What comes of an act that the rules of a domain of this level refuse.
static __always_inline int count(__u32 domain, __u32 level, bool is_told) {
  struct ModuleRefusals* counts = bpf_map_lookup_elem(&refusals, &domain);
  if (counts) {
    counts->refused += is_enforced(level);
    counts->passed += !is_enforced(level);
    counts->untold += !is_told;
  }
  return is_enforced(level) ? -EPERM : 0;
}

// Stands in for the one of shared.bpf.h. The first two numbers hold two each, as there is no room
// for more.
__weak __noinline int refuse_act(__u64 domain_and_level, __u64 kind_and_detail, __u64 value,
                                 __u32 label) {
  return -EPERM;
}

static __always_inline int refuse(__u32 domain, __u32 level, struct ModuleAct asked) {
  if (level == kLevelDisabled) return 0;
  return refuse_act((__u64)domain << 32 | level, (__u64)asked.kind << 32 | asked.detail,
                    asked.value, asked.label)
             ? -EPERM
             : 0;
}

// The same for a file, in those hooks that may ask for its path: those that the kernel lets sleep.
static __noinline int refuse_path(__u32 domain, __u32 level, struct ModuleAct* asked,
                                  struct path* path) {
  if (level == kLevelDisabled) return 0;
  return count(domain, level, tell_path(domain, level, asked, path));
}

// What no rule can grant to who is in a domain.
static __always_inline int refuse_in_any_domain(void) {
  __u32 domain = current_domain();
  if (domain == kNoDomain) return 0;
  return refuse(domain, level_of(word_of(domain)), act(kActReachModule, 0, 0));
}

#endif
