// What many programs at hooks call. The kernel would look through a function anew in each of them,
// so they have one that does nothing but refuse, in whose place the one that is here is put. It
// stands behind the others, as they have to be loaded before.
#ifndef SHARED_BPF_H
#define SHARED_BPF_H

#include "paths.bpf.h"

SEC("common/refuse_act")
int shared_refuse_act(__u64 domain_and_level, __u64 kind_and_detail, __u64 value, __u32 label) {
  __u32 domain = domain_and_level >> 32;
  __u32 level = domain_and_level;
  struct ModuleAct asked = {kind_and_detail >> 32, kind_and_detail, value, label};
  return count(domain, level, tell(domain, level, &asked));
}

SEC("common/label_of")
__u32 shared_label_of(__u64 entry) { return find_label_of(entry); }

SEC("common/find_path")
__u32 shared_find_path(__u64 mount, __u64 entry, __u64 rules_entry, __u64 is_in_any) {
  return look_for_path(mount, entry, rules_entry, is_in_any);
}

#endif
