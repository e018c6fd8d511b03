// Rules about the users and groups that processes become.
#ifndef IDENTITIES_BPF_H
#define IDENTITIES_BPF_H

#include "checks.bpf.h"

// The real one, the effective one, the saved one and that for files.
#define IDENTITIES 4

static __always_inline int check_identities(int check, const __u32* now, const __u32* before) {
  __u64 checked = ~0ULL;
#pragma clang loop unroll(full)
  for (int index = 0; index < IDENTITIES; index++) {
    if (now[index] == before[index] || now[index] == checked) continue;
    checked = now[index];
    int result = check_value(check, now[index]);
    if (result) return result;
  }
  return 0;
}

static __always_inline int check_users(const struct cred* now, const struct cred* before) {
  __u32 users[] = {now->uid.val, now->euid.val, now->suid.val, now->fsuid.val};
  __u32 former[] = {before->uid.val, before->euid.val, before->suid.val, before->fsuid.val};
  return check_identities(kCheckUser, users, former);
}

static __always_inline int check_groups(const struct cred* now, const struct cred* before) {
  __u32 groups[] = {now->gid.val, now->egid.val, now->sgid.val, now->fsgid.val};
  __u32 former[] = {before->gid.val, before->egid.val, before->sgid.val, before->fsgid.val};
  return check_identities(kCheckGroup, groups, former);
}

SEC("lsm/task_fix_setuid")
int BPF_PROG(become_user, struct cred* now, const struct cred* before, int flags) {
  return check_users(now, before);
}

SEC("lsm/task_fix_setgid")
int BPF_PROG(become_group, struct cred* now, const struct cred* before, int flags) {
  return check_groups(now, before);
}

struct Groups {
  unsigned long first;  // where it is in the kernel
  int result;
};

static long check_group(__u32 index, struct Groups* groups) {
  __u32 group = 0;
  bpf_probe_read_kernel(&group, sizeof(group), (void*)(groups->first + index * sizeof(group)));
  groups->result = check_value(kCheckGroup, group);
  return groups->result != 0;
}

SEC("lsm/task_fix_setgroups")
int BPF_PROG(join_groups, struct cred* now, const struct cred* before) {
  if (!current_task()) return 0;
  struct group_info* joined = now->group_info;
  struct Groups groups = {(unsigned long)joined->gid, 0};
  bpf_loop(joined->ngroups, check_group, &groups, 0);
  return groups.result;
}

#endif
