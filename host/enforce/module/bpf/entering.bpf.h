// Who goes into a domain with the next program that it executes, as it was asked for from outside.
#ifndef ENTERING_BPF_H
#define ENTERING_BPF_H

#include "domain.bpf.h"

#define SIGKILL 9

// Of the first thread of a process.
struct {
  __uint(type, BPF_MAP_TYPE_TASK_STORAGE);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, int);
  __type(value, struct ModuleEntering);
} entering SEC(".maps");

// Another thread that executes a program becomes the first one, and what was asked for is lost.
static __always_inline bool loses_entry(void) {
  __u64 number = bpf_get_current_pid_tgid();
  if (number >> 32 == (__u32)number) return false;
  struct task_struct* process = bpf_get_current_task_btf()->group_leader;
  struct ModuleEntering* asked = bpf_task_storage_get(&entering, process, 0, 0);
  return asked && asked->next;
}

// Puts the current process where it was asked for, and once. What is executed by now cannot fail,
// and nobody else may run it.
static __always_inline bool enter_as_asked(void) {
  struct task_struct* process = bpf_get_current_task_btf();
  struct ModuleEntering* asked = bpf_task_storage_get(&entering, process, 0, 0);
  if (!asked || !asked->next) return false;
  struct ModuleTask placed = {asked->next - 1, 0};
  asked->next = 0;
  struct ModuleTask* task =
      bpf_task_storage_get(&tasks, process, &placed, BPF_LOCAL_STORAGE_GET_F_CREATE);
  if (task) {
    *task = placed;
  } else {
    bpf_send_signal(SIGKILL);
  }
  return true;
}

#endif
