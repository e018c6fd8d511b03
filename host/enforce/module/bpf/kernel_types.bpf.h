// Of the kernel's types what the programs read. Where a field lies is looked up when they are
// loaded.
#ifndef KERNEL_TYPES_BPF_H
#define KERNEL_TYPES_BPF_H

#include <linux/bpf.h>

#pragma clang attribute push(__attribute__((preserve_access_index)), apply_to = record)

struct cred;

struct mnt_namespace {
  __u64 event;  // grows with each change of its mounts
};

struct nsproxy {
  struct mnt_namespace* mnt_ns;
};

struct thread_info {
  __u32 status;
};

struct task_struct {
  struct thread_info thread_info;
  struct task_struct* group_leader;
  struct task_struct* real_parent;
  const struct cred* cred;
  __s32 tgid;
  __u64 start_boottime;
  struct nsproxy* nsproxy;
};

struct user_namespace {
  int level;
};

// The first 32 of them, whatever the kernel has them in.
struct kernel_capabilities {
  __u32 first;
};

struct dentry;

struct super_block {
  __u32 s_dev;
  unsigned long s_flags;
  unsigned long s_magic;
  struct dentry* s_root;
};

struct inode {
  unsigned short i_mode;
  __u32 i_nlink;
  __u32 i_generation;
  unsigned long i_ino;
  struct super_block* i_sb;
};

struct qstr {
  __u32 hash;
  __u32 len;
  const unsigned char* name;
};

// Grows with each change of what it is about.
struct seqcount {
  __u32 sequence;
};

struct seqcount_spinlock {
  struct seqcount seqcount;
};

struct dentry {
  struct seqcount_spinlock d_seq;
  struct dentry* d_parent;
  struct qstr d_name;
  struct inode* d_inode;
  struct super_block* d_sb;
};

struct vfsmount {
  int mnt_flags;
  struct dentry* mnt_root;
};

struct mount {
  struct mount* mnt_parent;
  struct dentry* mnt_mountpoint;
  struct vfsmount mnt;
  struct mnt_namespace* mnt_ns;
};

struct path {
  struct vfsmount* mnt;
  struct dentry* dentry;
};

struct file {
  __u32 f_mode;
  __u32 f_flags;
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
  struct kernel_capabilities cap_effective;
  struct user_namespace* user_ns;
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

#if defined(__TARGET_ARCH_x86)
struct pt_regs {
  unsigned long bx;
  unsigned long di;
  unsigned long orig_ax;
};
#elif defined(__TARGET_ARCH_arm64)
struct pt_regs {
  unsigned long pstate;
  unsigned long orig_x0;
  int syscallno;
};
#endif

struct key_type {
  const char* name;
};

struct key {
  struct key_type* type;
};

struct io_uring_cmd {
  __u32 cmd_op;
};

struct vm_area_struct {
  struct file* vm_file;
};

struct renamedata {
  struct dentry* old_dentry;
  struct dentry* new_dentry;
};

struct linux_binprm {
  struct file* file;
  int unsafe;
  const char* filename;
  const char* interp;
  char buf[2];
};

struct unix_address;

struct unix_sock {
  struct unix_address* addr;
  struct path path;
};

#pragma clang attribute pop

struct kernel_siginfo;
struct sockaddr;

#endif
