// Rules about the parameters of calls.
#ifndef CHECKS_BPF_H
#define CHECKS_BPF_H

#include "calls.bpf.h"

// Whoever asks for no change of its own is told so by this hook, and the kernel goes on.
#define NOT_HANDLED (-ENOSYS)

#define SIGURG 23
#define SIGIO 29
#define F_SETOWN 8
#define F_SETSIG 10
#define F_SETOWN_EX 15
#define FIOSETOWN 0x8901
#define SIOCSPGRP 0x8902

// The last range that begins at the value or before is the only one that can have it. It is looked
// for without branches, as the kernel would look through what follows each of them.
static __always_inline bool passes(struct ModuleCheck* check, __u32 value) {
  __u64 at = 0;
  if (value < kSmallValues) return check->small >> value & 1;
#pragma clang loop unroll(full)
  for (__u64 step = kMostModuleRanges / 2; step; step /= 2) {
    __u64 first = check->ranges[(at + step) % kMostModuleRanges].first;
    __u64 is_beyond = (__s64)(value - first) >> 63;
    barrier_var(is_beyond);
    at += step & ~is_beyond;
  }
  struct ModuleRange* range = &check->ranges[at % kMostModuleRanges];
  return check->count && value >= range->first && value <= range->last;
}

static __always_inline int judge_value(struct Asker* asker, struct ModuleRules* granted,
                                       __u32 check, __u32 value) {
  __u64 index = check;
  // What is compared and what is used are the same for the verifier then.
  asm volatile("" : "+r"(index));
  if (granted && index < kModuleChecks && passes(&granted->checks[index], value)) return 0;
  return refuse_asker(asker, act(kActPassValue, check, value));
}

static __always_inline int check_value_in(__u32 domain, __u32 check, __u32 value) {
  struct Asker asker = {};
  ask_for(&asker, domain);
  struct ModuleRules* granted = rules_of(asker.word);
  int result = judge_call(&asker, granted);
  return result ? result : judge_value(&asker, granted, check, value);
}

__noinline int judge_call_and_value(__u32 check, __u32 value) {
  struct ModuleTask* task = current_task();
  return task ? check_value_in(task->domain, check, value) : 0;
}

static __always_inline int check_value(__u32 check, __u32 value) {
  return judge_call_and_value(check, value) ? -EPERM : 0;
}

// What a descriptor that is ready sends to its owner. All that the kernel takes for a signal is
// asked.
__noinline int judge_owned(__u64 signal) {
  struct Asker asker = {};
  if (signal > kMostSignals || !is_asked(&asker)) return 0;
  struct ModuleRules* granted = rules_of(asker.word);
  if (granted && granted->ownedSignals >> ((signal - 1) & 63) & 1) return 0;
  return refuse_asker(&asker, act(kActPassValue, kCheckSignal, signal));
}

static __always_inline int check_owned(__u64 signal) { return judge_owned(signal) ? -EPERM : 0; }

static __always_inline int check_owner(void) {
  return judge_owned(SIGIO) || judge_owned(SIGURG) ? -EPERM : 0;
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
  struct Asker asker = {};
  if (!is_asked(&asker)) return 0;
  struct ModuleRules* granted = rules_of(asker.word);
  int result = judge_call(&asker, granted);
  if (result) return result;
  if (granted && passes(&granted->checks[kCheckIoctl], request))
    return is_about_owner(request) ? check_owner() : 0;
  return refuse_asker_path(&asker, act(kActPassValue, kCheckIoctl, request), &file->f_path);
}

// Calls of programs for 32 bits, which older kernels hand to the other hook.
SEC("?lsm/file_ioctl_compat")
int BPF_PROG(use_ioctl_compat, struct file* file, unsigned int request, unsigned long argument) {
  int result = check_value(kCheckIoctl, request);
  return result || !is_about_owner(request) ? result : check_owner();
}

#endif
