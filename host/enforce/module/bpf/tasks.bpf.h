// Who is in which domain: a child in its parent's, whatever becomes of its threads.

#define CLONE_THREAD 0x00010000

// The signal of a child is not among the flags any more.
static __always_inline int check_clone(__u32 domain, __u64 flags) {
  __u64 word = word_of(domain);
  struct ModuleRules* granted = rules_of(word);
  int result = judge_call(domain, word, granted);
  return result ? result : judge_flags(domain, word, granted, flags);
}

SEC("lsm/task_alloc")
int BPF_PROG(inherit_domain, struct task_struct* task, unsigned long clone_flags) {
  struct ModuleTask* parent = current_task();
  if (!parent) return 0;
  int result = check_clone(parent->domain, clone_flags);
  if (result || clone_flags & CLONE_THREAD) return result;
  struct ModuleTask child = *parent;
  bool is_placed = bpf_task_storage_get(&tasks, task, &child, BPF_LOCAL_STORAGE_GET_F_CREATE);
  return is_placed ? 0 : -ENOMEM;
}

// Whichever thread executes a program is the first one then, and what was known of the former is
// gone.
SEC("lsm/bprm_creds_for_exec")
int BPF_PROG(keep_domain, struct linux_binprm* program) {
  struct task_struct* thread = bpf_get_current_task_btf();
  struct ModuleTask* process = task_of(thread);
  if (!process) return 0;
  struct ModuleTask same = *process;
  struct ModuleTask* own =
      bpf_task_storage_get(&tasks, thread, &same, BPF_LOCAL_STORAGE_GET_F_CREATE);
  if (!own) return -ENOMEM;
  own->domain = same.domain;
  return 0;
}
