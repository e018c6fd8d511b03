// What would undo all this: nobody in a domain may reach programs and maps, nor act as one who can.
#ifndef SELF_PROTECTION_BPF_H
#define SELF_PROTECTION_BPF_H

#include "identities.bpf.h"
#include "kernel_helpers.bpf.h"

SEC("lsm/bpf")
int BPF_PROG(protect_maps, int command, union bpf_attr* attributes, unsigned int size) {
  return refuse_in_any_domain();
}

// ---- Other processes

// Whoever asks in this way will not be told of a refusal, and is not counted.
#define PTRACE_MODE_NOAUDIT 0x04

static __always_inline bool is_in(__u32 domain, struct task_struct* process) {
  struct ModuleTask* task = task_of(process);
  return task && task->domain == domain;
}

// Whoever controls a process does what its domain may do.
static __always_inline int protect_process(struct task_struct* process) {
  struct Asker asker = {};
  if (!is_asked(&asker) || is_in(asker.domain, process)) return 0;
  return refuse_asker(&asker, act(kActReachModule, 0, 0));
}

SEC("lsm/ptrace_access_check")
int BPF_PROG(protect_from_tracing, struct task_struct* process, unsigned int mode) {
  if (!(mode & PTRACE_MODE_NOAUDIT)) return protect_process(process);
  struct Asker asker = {};
  if (!is_asked(&asker) || is_in(asker.domain, process)) return 0;
  return is_enforced(level_of(asker.word)) ? -EPERM : 0;
}

// Here it is the other one who would control this process.
SEC("lsm/ptrace_traceme")
int BPF_PROG(protect_from_asked_tracing, struct task_struct* tracer) {
  struct ModuleTask* other = task_of(tracer);
  if (!other || is_in(other->domain, bpf_get_current_task_btf())) return 0;
  return refuse(other->domain, level_of(word_of(other->domain)), act(kActReachModule, 0, 0));
}

// A limit of processor time that is over ends a process.
SEC("lsm/task_setrlimit")
int BPF_PROG(protect_from_limits, struct task_struct* process, unsigned int resource) {
  return protect_process(process);
}

// ---- The kernel

// Of what is read or loaded for the kernel, all that is no firmware becomes a part of it.
#define FIRMWARE 1

SEC("lsm/kernel_read_file")
int BPF_PROG(protect_from_read_code, struct file* file, int what, bool is_contents) {
  return what == FIRMWARE ? 0 : refuse_in_any_domain();
}

SEC("lsm/kernel_load_data")
int BPF_PROG(protect_from_loaded_code, int what, bool is_contents) {
  return what == FIRMWARE ? 0 : refuse_in_any_domain();
}

// What a kernel that is locked down refuses everybody: memory, ports and tables of the machine, and
// ways to trace the kernel.
SEC("lsm/locked_down")
int BPF_PROG(protect_memory, int what) { return refuse_in_any_domain(); }

SEC("lsm/perf_event_open")
int BPF_PROG(protect_from_counters, void* attributes, int type) { return refuse_in_any_domain(); }

// ---- What the kernel executes by itself, in no domain

// To have a key made the kernel executes a program.
SEC("lsm/key_alloc")
int BPF_PROG(protect_from_made_keys, struct key* key, const struct cred* owner,
             unsigned long flags) {
  if (!current_task()) return 0;
  char type[LONGEST_NAME] = {};
  bpf_probe_read_kernel_str(type, sizeof(type), key->type->name);
  return bpf_strncmp(type, sizeof(type), ".request_key_auth") ? 0 : refuse_in_any_domain();
}

// ---- Rings

// What a ring does for who has left it its rights.
SEC("lsm/uring_override_creds")
int BPF_PROG(act_as_other, const struct cred* other) {
  const struct cred* own = bpf_get_current_task_btf()->cred;
  int result = check_users(other, own);
  return result ? result : check_groups(other, own);
}

SEC("lsm/uring_cmd")
int BPF_PROG(use_ring_command, struct io_uring_cmd* command) {
  return check_value(kCheckIoctl, command->cmd_op);
}

#endif
