// Of the kernel's types what the programs read. Where a field lies is looked up when they are
// loaded.
#ifndef KERNEL_TYPES_BPF_H
#define KERNEL_TYPES_BPF_H

#include <linux/bpf.h>

#pragma clang attribute push(__attribute__((preserve_access_index)), apply_to = record)

struct task_struct {
  struct task_struct* group_leader;
  struct task_struct* real_parent;
  __s32 tgid;
  __u64 start_boottime;
};

struct path {
  struct vfsmount* mnt;
  struct dentry* dentry;
};

struct file {
  struct path f_path;
};

struct super_block {
  unsigned long s_magic;
};

struct inode {
  struct super_block* i_sb;
};

#pragma clang attribute pop

struct cred;
struct dentry;
struct linux_binprm;
struct user_namespace;
struct vfsmount;

#endif
