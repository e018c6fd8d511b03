// Of the kernel's types what the programs read. Where a field lies is looked up when they are
// loaded.
#ifndef KERNEL_TYPES_BPF_H
#define KERNEL_TYPES_BPF_H

#include <linux/bpf.h>

#pragma clang attribute push(__attribute__((preserve_access_index)), apply_to = record)

struct task_struct {
  struct task_struct* group_leader;
  struct task_struct* real_parent;
  const struct cred* cred;
  __s32 tgid;
  __u64 start_boottime;
};

struct path {
  struct vfsmount* mnt;
  struct dentry* dentry;
};

struct file {
  __u32 f_mode;
  struct inode* f_inode;
  struct path f_path;
};

typedef struct {
  __u32 val;
} kuid_t;

typedef struct {
  __u32 val;
} kgid_t;

struct group_info {
  int ngroups;
  kgid_t gid[];
};

struct cred {
  kuid_t uid;
  kuid_t euid;
  kuid_t suid;
  kuid_t fsuid;
  kgid_t gid;
  kgid_t egid;
  kgid_t sgid;
  kgid_t fsgid;
  struct group_info* group_info;
};

struct sock_common {
  unsigned short skc_family;
  __u16 skc_num;
};

struct sock {
  struct sock_common __sk_common;
};

struct socket {
  short type;
  struct sock* sk;
};

struct msghdr {
  void* msg_name;
  int msg_namelen;
};

struct pt_regs {
#if defined(__TARGET_ARCH_arm64)
  __s32 syscallno;
#else
  unsigned long orig_ax;
#endif
};

struct key_type {
  const char* name;
};

struct key {
  struct key_type* type;
};

struct io_uring_cmd {
  __u32 cmd_op;
};

struct super_block {
  unsigned long s_magic;
};

struct inode {
  struct super_block* i_sb;
};

struct qstr {
  const unsigned char* name;
};

struct dentry {
  struct qstr d_name;
  struct inode* d_inode;
};

#pragma clang attribute pop

struct dentry;
struct linux_binprm;
struct sockaddr;
struct user_namespace;
struct vfsmount;

#endif
