// Rules about system calls: whoever comes to a hook is asked by which call.
#ifndef CALLS_BPF_H
#define CALLS_BPF_H

#include "refusal.bpf.h"

struct Call {
  __u32 table;
  __u32 number;
  __u64 argument;  // the first one
};

#if defined(__TARGET_ARCH_x86)

#define NR_UNSHARE 272
#define NR_UNSHARE_OF_32_BITS 310
#define TS_COMPAT 0x0002

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
static __always_inline int judge_call(__u32 domain, __u32 level, struct ModuleRules* granted) {
  struct Call call = current_call();
  if (granted && is_call_granted(granted, call)) return 0;
  return refuse(domain, level, act(kActCall, call.table, call.number));
}

// Flags of new processes, and of what a process no longer shares with others.
static __always_inline int judge_flags(__u32 domain, __u32 level, struct ModuleRules* granted,
                                       __u64 flags) {
  __u64 lacking = granted ? flags & ~granted->cloneFlags : flags;
  if (!lacking && granted) return 0;
  return refuse(domain, level, act(kActPassValue, kCheckFlags, lacking));
}

static __always_inline bool is_unshare(struct Call call) {
  return call.number == (call.table == kCallsOfMachine ? NR_UNSHARE : NR_UNSHARE_OF_32_BITS);
}

static __always_inline int check_call(void) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  __u64 word = word_of(task->domain);
  if (level_of(word) == kLevelDisabled) return 0;
  return judge_call(task->domain, level_of(word), rules_of(word));
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
