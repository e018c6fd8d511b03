// By which system call a hook was reached.
#ifndef CALLING_BPF_H
#define CALLING_BPF_H

#include "kernel_types.bpf.h"
// What the types are needed for.
#include <bpf/bpf_helpers.h>

// What programs for x32 add.
#define X32_SYSCALL_BIT 0x40000000

static __always_inline __u32 number_of_call(void) {
  struct pt_regs* registers = (struct pt_regs*)bpf_task_pt_regs(bpf_get_current_task_btf());
#if defined(__TARGET_ARCH_arm64)
  return registers->syscallno;
#else
  return registers->orig_ax & ~X32_SYSCALL_BIT;
#endif
}

#endif
