// Rules about system calls: whoever comes to a hook is asked by which call.
#ifndef CALLS_BPF_H
#define CALLS_BPF_H

#include "asker.bpf.h"

// What programs for x32 add to the number of a call.
#define X32_SYSCALL_BIT 0x40000000

struct Call {
  __u32 table;
  __u32 number;
  __u64 argument;  // the first one
};

#if defined(__TARGET_ARCH_x86)

#define NR_UNSHARE 272
#define NR_UNSHARE_OF_32_BITS 310
#define TS_COMPAT 0x0002

static __always_inline bool is_older_about_mounts(struct Call call) {
  bool is_of_machine = call.table == kCallsOfMachine;
  switch (call.number & ~X32_SYSCALL_BIT) {
    case 155:  // pivot_root
    case 165:  // mount
    case 166:  // umount2
      return is_of_machine;
    case 21:   // mount
    case 22:   // umount
    case 52:   // umount2
    case 217:  // pivot_root
      return !is_of_machine;
  }
  return false;
}

// The kernel takes the lower half of the register for the number, whatever else is there. One of
// the x32 interface has a bit that no granted one has.
static __always_inline struct Call call_of(struct task_struct* thread) {
  struct pt_regs* registers = (struct pt_regs*)bpf_task_pt_regs(thread);
  bool is_of_machine = !(thread->thread_info.status & TS_COMPAT);
  struct Call call = {.table = is_of_machine ? kCallsOfMachine : kCallsOf32Bits,
                      .number = registers->orig_ax,
                      .argument = is_of_machine ? registers->di : registers->bx};
  return call;
}

#elif defined(__TARGET_ARCH_arm64)

#define NR_UNSHARE 97
#define NR_UNSHARE_OF_32_BITS 337
#define PSR_MODE32_BIT 0x10

static __always_inline bool is_older_about_mounts(struct Call call) {
  bool is_of_machine = call.table == kCallsOfMachine;
  switch (call.number) {
    case 39:  // umount2
    case 40:  // mount
    case 41:  // pivot_root
      return is_of_machine;
    case 21:   // mount
    case 52:   // umount2
    case 218:  // pivot_root
      return !is_of_machine;
  }
  return false;
}

static __always_inline struct Call call_of(struct task_struct* thread) {
  struct pt_regs* registers = (struct pt_regs*)bpf_task_pt_regs(thread);
  struct Call call = {
      .table = registers->pstate & PSR_MODE32_BIT ? kCallsOf32Bits : kCallsOfMachine,
      .number = registers->syscallno,
      .argument = registers->orig_x0};
  return call;
}

#endif

static __always_inline struct Call current_call(void) {
  return call_of(bpf_get_current_task_btf());
}

static __always_inline bool is_call_granted(struct ModuleRules* granted, struct Call call) {
  __u32 number = call.number;
  if (number >= kMostCalls) return false;
  // The verifier has to see the bound, which the compiler would find needless.
  barrier_var(number);
  __u64 calls = granted->calls[call.table % kCallTables][number / kCallsInWord % kWordsOfCalls];
  return calls >> number % kCallsInWord & 1;
}

// For hooks that have looked up the rules already. Of a domain that there is not, none is granted.
static __always_inline int judge_call(struct Asker* asker, struct ModuleRules* granted) {
  struct Call call = current_call();
  if (granted && is_call_granted(granted, call)) return 0;
  return refuse_asker(asker, act(kActCall, call.table, call.number));
}

// Flags of new processes, and of what a process no longer shares with others.
static __always_inline int judge_flags(struct Asker* asker, struct ModuleRules* granted,
                                       __u64 flags) {
  __u64 lacking = granted ? flags & ~granted->cloneFlags : flags;
  if (!lacking && granted) return 0;
  return refuse_asker(asker, act(kActPassValue, kCheckFlags, lacking));
}

static __always_inline bool is_unshare(struct Call call) {
  return call.number == (call.table == kCallsOfMachine ? NR_UNSHARE : NR_UNSHARE_OF_32_BITS);
}

static __always_inline int check_call_in(__u32 domain) {
  struct Asker asker = {};
  ask_for(&asker, domain);
  return is_free(&asker) ? 0 : judge_call(&asker, rules_of(asker.word));
}

static __always_inline int check_call(void) {
  struct ModuleTask* task = current_task();
  return task ? check_call_in(task->domain) : 0;
}

SEC("lsm/socket_accept")
int BPF_PROG(accept_connection) { return check_call(); }

// Of what has no place in any file system, what the kernel has this hook for.
SEC("lsm/inode_init_security_anon")
int BPF_PROG(make_anonymous_file) { return check_call(); }

SEC("lsm/inode_getattr")
int BPF_PROG(read_status, const struct path* path) { return check_call(); }

// Modes, owners, times and sizes.
SEC("lsm/inode_setattr")
int BPF_PROG(change_status) { return check_call(); }

#endif
