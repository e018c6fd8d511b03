// Who asks for something that rules speak of, and by which rules.
#ifndef ASKER_BPF_H
#define ASKER_BPF_H

#include "refusal.bpf.h"

// Rules that grant nothing: those of a domain that there is not.
#define NO_ENTRY (~0U)

struct Asker {
  __u32 domain;
  __u64 word;  // of the domain
};

static __always_inline void ask_for(struct Asker* asker, __u32 domain) {
  asker->domain = domain;
  asker->word = word_of(domain);
}

static __always_inline bool is_free(struct Asker* asker) {
  return level_of(asker->word) == kLevelDisabled;
}

// False for who may do everything.
static __always_inline bool is_asked(struct Asker* asker) {
  __u32 domain = current_domain();
  if (domain == kNoDomain) return false;
  ask_for(asker, domain);
  return !is_free(asker);
}

static __always_inline __u32 entry_of(__u64 word) {
  return level_of(word) == kLevelAbsent ? NO_ENTRY : word >> kEntryShift;
}

static __always_inline int refuse_asker(struct Asker* asker, struct ModuleAct asked) {
  return refuse(asker->domain, level_of(asker->word), asked);
}

static __always_inline int refuse_asker_path(struct Asker* asker, struct ModuleAct asked,
                                             struct path* path) {
  return refuse_path(asker->domain, level_of(asker->word), &asked, path);
}

#endif
