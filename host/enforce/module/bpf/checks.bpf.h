// Rules about the parameters of calls.
#ifndef CHECKS_BPF_H
#define CHECKS_BPF_H

#include "refusal.bpf.h"

// Whoever asks for no change of its own is told so by this hook, and the kernel goes on.
#define NOT_HANDLED (-ENOSYS)

static __always_inline bool passes(struct ModuleCheck* check, __u32 value) {
  for (__u32 index = 0; index < kMostModuleRanges; index++) {
    if (index >= check->count) return false;
    if (value >= check->ranges[index].first && value <= check->ranges[index].last) return true;
  }
  return false;
}

// Of a domain that there is not, no value passes.
static __always_inline bool has_passed(__u64 word, int check, __u32 value) {
  struct ModuleRules* granted = rules_of(word);
  return granted && level_of(word) != kLevelAbsent && passes(&granted->checks[check], value);
}

static __always_inline int check_value(int check, __u32 value) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  __u64 word = word_of(task->domain);
  if (has_passed(word, check, value)) return 0;
  return refuse(task->domain, level_of(word), act(kActPassValue, check, value));
}

SEC("lsm/task_prctl")
int BPF_PROG(use_prctl, int option, unsigned long first, unsigned long second, unsigned long third,
             unsigned long fourth) {
  int result = check_value(kCheckPrctl, option);
  return result ? result : NOT_HANDLED;
}

SEC("lsm/file_ioctl")
int BPF_PROG(use_ioctl, struct file* file, unsigned int request, unsigned long argument) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  __u64 word = word_of(task->domain);
  if (has_passed(word, kCheckIoctl, request)) return 0;
  return refuse_path(task->domain, level_of(word), act(kActPassValue, kCheckIoctl, request),
                     &file->f_path);
}

// Calls of programs for 32 bits, which older kernels hand to the other hook.
SEC("?lsm/file_ioctl_compat")
int BPF_PROG(use_ioctl_compat, struct file* file, unsigned int request, unsigned long argument) {
  return check_value(kCheckIoctl, request);
}

#endif
