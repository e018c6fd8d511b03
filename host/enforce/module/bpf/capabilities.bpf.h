// Rules about capabilities: who has one may use it where a rule of its domain grants it.
#include "calls.bpf.h"

// Whoever asks in this way will not be told of a refusal, and is not counted.
#define CAP_OPT_NOAUDIT 2

#define CAP_SYS_ADMIN 21

// Calls that this capability is asked for where they make, change, move or remove a mount: to
// unmount what is above the pinned programs unmounts them, too, to mount over them hides them, and
// rules about paths take mounts as they are in the whole machine. Newer calls have one number in
// all tables.
static __always_inline bool is_about_mounts(struct Call call) {
  switch (call.number & ~X32_SYSCALL_BIT) {
    case 428:  // open_tree
    case 429:  // move_mount
    case 430:  // fsopen
    case 432:  // fsmount
    case 433:  // fspick
    case 442:  // mount_setattr
    case 467:  // open_tree_attr
      return true;
  }
  return is_older_about_mounts(call);
}

// What takes a capability comes to no other hook, as a rule. New namespaces are among it.
static __always_inline int judge_privileged_call(struct Asker* asker, struct ModuleRules* granted) {
  int result = judge_call(asker, granted);
  if (result) return result;
  struct Call call = current_call();
  return is_unshare(call) ? judge_flags(asker, granted, call.argument) : 0;
}

// A user namespace takes none.
SEC("lsm/userns_create")
int BPF_PROG(make_user_namespace, const struct cred* cred) {
  struct Asker asker = {};
  return is_asked(&asker) ? judge_privileged_call(&asker, rules_of(asker.word)) : 0;
}

SEC("lsm/capable")
int BPF_PROG(use_capability, const struct cred* cred, struct user_namespace* space, int capability,
             unsigned int options) {
  struct Asker asker = {};
  if (!is_asked(&asker)) return 0;
  bool is_told = !(options & CAP_OPT_NOAUDIT);
  int unheard = is_enforced(level_of(asker.word)) ? -EPERM : 0;
  if (capability == CAP_SYS_ADMIN && is_about_mounts(current_call())) {
    int result = is_told ? refuse_asker(&asker, act(kActReachModule, 0, 0)) : unheard;
    if (result) return result;
  }
  struct ModuleRules* granted = rules_of(asker.word);
  if (granted && granted->capabilities >> (capability & 63) & 1)
    return is_told ? judge_privileged_call(&asker, granted) : 0;
  if (!is_told) return unheard;
  return refuse_asker(&asker, act(kActUseCapability, 0, capability));
}
