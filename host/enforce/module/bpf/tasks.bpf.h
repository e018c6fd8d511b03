// Who is in which domain: a child in its parent's, whatever becomes of its threads.

#define CLONE_THREAD 0x00010000

// The signal of a child is not among the flags any more.
static __always_inline int check_clone(__u32 domain, __u64 flags) {
  struct Asker asker = {};
  ask_for(&asker, domain);
  struct ModuleRules* granted = rules_of(asker.word);
  int result = judge_call(&asker, granted);
  return result ? result : judge_flags(&asker, granted, flags);
}

SEC("lsm/task_alloc")
int BPF_PROG(inherit_domain, struct task_struct* task, unsigned long clone_flags) {
  struct ModuleTask* parent = current_task();
  if (!parent) return 0;
  int result = check_clone(parent->domain, clone_flags);
  if (result || clone_flags & CLONE_THREAD) return result;
  struct ModuleTask child = {parent->domain, 0};
  bool is_placed = bpf_task_storage_get(&tasks, task, &child, BPF_LOCAL_STORAGE_GET_F_CREATE);
  return is_placed ? 0 : -ENOMEM;
}
