// Rules about capabilities: who has one may use it where a rule of its domain grants it.
#include "calls.bpf.h"

// Whoever asks in this way will not be told of a refusal, and is not counted.
#define CAP_OPT_NOAUDIT 2

#define CAP_SYS_ADMIN 21

// What programs for x32 add to the number of a call.
#define X32_SYSCALL_BIT 0x40000000

// Calls that make or change a mount of nobody's yet, which no hook is at but that this capability
// is asked for.
static __always_inline bool is_about_mounts(__u32 call) {
  return call == 428      // open_tree
         || call == 430   // fsopen
         || call == 432   // fsmount
         || call == 433   // fspick
         || call == 442   // mount_setattr
         || call == 467;  // open_tree_attr
}

// What takes a capability comes to no other hook, as a rule. New namespaces are among it.
static __always_inline int judge_privileged_call(__u32 domain, __u32 level,
                                                 struct ModuleRules* granted) {
  int result = judge_call(domain, level, granted);
  if (result) return result;
  struct Call call = current_call();
  return is_unshare(call) ? judge_flags(domain, level, granted, call.argument) : 0;
}

// A user namespace takes none.
SEC("lsm/userns_create")
int BPF_PROG(make_user_namespace, const struct cred* cred) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  __u64 word = word_of(task->domain);
  return judge_privileged_call(task->domain, level_of(word), rules_of(word));
}

SEC("lsm/capable")
int BPF_PROG(use_capability, const struct cred* cred, struct user_namespace* space, int capability,
             unsigned int options) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  if (capability == CAP_SYS_ADMIN && is_about_mounts(current_call().number & ~X32_SYSCALL_BIT)) {
    int result = refuse_in_any_domain();
    if (result) return result;
  }
  __u64 word = word_of(task->domain);
  struct ModuleRules* granted = rules_of(word);
  if (granted && granted->capabilities >> (capability & 63) & 1)
    return options & CAP_OPT_NOAUDIT ? 0
                                     : judge_privileged_call(task->domain, level_of(word), granted);
  if (options & CAP_OPT_NOAUDIT) return is_enforced(level_of(word)) ? -EPERM : 0;
  return refuse(task->domain, level_of(word), act(kActUseCapability, 0, capability));
}
