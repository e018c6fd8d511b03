// Rules about capabilities: who has one may use it where a rule of its domain grants it.

// Whoever asks in this way will not be told of a refusal, and is not counted.
#define CAP_OPT_NOAUDIT 2

SEC("lsm/capable")
int BPF_PROG(use_capability, const struct cred* cred, struct user_namespace* space, int capability,
             unsigned int options) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  __u64 word = word_of(task->domain);
  struct ModuleRules* granted = rules_of(word);
  if (granted && level_of(word) != kLevelAbsent && granted->capabilities >> (capability & 63) & 1)
    return 0;
  if (options & CAP_OPT_NOAUDIT) return is_enforced(level_of(word)) ? -EPERM : 0;
  return refuse(task->domain, level_of(word), act(kActUseCapability, 0, capability));
}
