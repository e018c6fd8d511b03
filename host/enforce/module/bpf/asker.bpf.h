// Who asks for something that rules about labels and paths speak of, and by which rules.
#ifndef ASKER_BPF_H
#define ASKER_BPF_H

#include "calls.bpf.h"

// Rules that grant nothing: those of a domain that there is not.
#define NO_ENTRY (~0U)

struct Asker {
  __u32 domain;
  __u32 level;
  __u32 entry;
  struct ModuleRules* granted;
};

static __always_inline void ask_for(struct Asker* asker, __u32 domain) {
  __u64 word = word_of(domain);
  asker->domain = domain;
  asker->level = level_of(word);
  asker->granted = rules_of(word);
  asker->entry = asker->granted ? word >> kEntryShift : NO_ENTRY;
}

// False for who may do everything.
static __always_inline bool is_asked(struct Asker* asker) {
  struct ModuleTask* task = current_task();
  if (!task) return false;
  ask_for(asker, task->domain);
  return asker->level != kLevelDisabled;
}

static __always_inline bool has_paths(struct Asker* asker) {
  return asker->granted && asker->granted->hasPaths;
}

static __always_inline int judge_call_of(struct Asker* asker) {
  return judge_call(asker->domain, asker->level, asker->granted);
}

#endif
