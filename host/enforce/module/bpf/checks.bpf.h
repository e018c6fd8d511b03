// Rules about the parameters of calls.
#ifndef CHECKS_BPF_H
#define CHECKS_BPF_H

#include "refusal.bpf.h"

// Whoever asks for no change of its own is told so by this hook, and the kernel goes on.
#define NOT_HANDLED (-ENOSYS)

#define SIGURG 23
#define SIGIO 29
#define F_SETOWN 8
#define F_SETSIG 10
#define F_SETOWN_EX 15
#define FIOSETOWN 0x8901
#define SIOCSPGRP 0x8902

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
  int result = judge_call(task->domain, word, rules_of(word));
  if (result) return result;
  if (has_passed(word, check, value)) return 0;
  return refuse(task->domain, level_of(word), act(kActPassValue, check, value));
}

// What a descriptor that is ready sends to its owner. All that the kernel takes for a signal is
// asked.
static __always_inline int check_owned(__u64 signal) {
  struct ModuleTask* task = current_task();
  if (!task || signal > kMostSignals) return 0;
  __u64 word = word_of(task->domain);
  struct ModuleRules* granted = rules_of(word);
  bool is_there = granted && level_of(word) != kLevelAbsent;
  if (is_there && granted->ownedSignals >> ((signal - 1) & 63) & 1) return 0;
  return refuse(task->domain, level_of(word), act(kActPassValue, kCheckSignal, signal));
}

static __always_inline int check_owner(void) {
  int result = check_owned(SIGIO);
  return result ? result : check_owned(SIGURG);
}

// Of who asks in the name of another the current process knows nothing. Newer verifiers take that
// argument for one that is never null.
SEC("lsm/task_kill")
int BPF_PROG(send_signal, struct task_struct* process, struct kernel_siginfo* info, int signal) {
  __u64 of_another = 0;
  bpf_probe_read_kernel(&of_another, sizeof(of_another), &ctx[3]);
  return of_another ? 0 : check_value(kCheckSignal, signal);
}

SEC("lsm/file_fcntl")
int BPF_PROG(use_fcntl, struct file* file, unsigned int command, unsigned long argument) {
  int result = check_call();
  if (result) return result;
  if (command == F_SETOWN || command == F_SETOWN_EX) return check_owner();
  return command == F_SETSIG ? check_owned(argument ? argument : SIGIO) : 0;
}

SEC("lsm/task_prctl")
int BPF_PROG(use_prctl, int option, unsigned long first, unsigned long second, unsigned long third,
             unsigned long fourth) {
  int result = check_value(kCheckPrctl, option);
  return result ? result : NOT_HANDLED;
}

static __always_inline bool is_about_owner(__u32 request) {
  return request == FIOSETOWN || request == SIOCSPGRP;
}

SEC("lsm/file_ioctl")
int BPF_PROG(use_ioctl, struct file* file, unsigned int request, unsigned long argument) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  __u64 word = word_of(task->domain);
  int result = judge_call(task->domain, word, rules_of(word));
  if (result) return result;
  if (has_passed(word, kCheckIoctl, request)) return is_about_owner(request) ? check_owner() : 0;
  return refuse_path(task->domain, level_of(word), act(kActPassValue, kCheckIoctl, request),
                     &file->f_path);
}

// Calls of programs for 32 bits, which older kernels hand to the other hook.
SEC("?lsm/file_ioctl_compat")
int BPF_PROG(use_ioctl_compat, struct file* file, unsigned int request, unsigned long argument) {
  int result = check_value(kCheckIoctl, request);
  return result || !is_about_owner(request) ? result : check_owner();
}

#endif
