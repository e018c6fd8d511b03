// What would undo all this: nobody in a domain may reach programs and maps, nor act as one who can.

// Of the file system that they are pinned in.
#define BPF_FS_MAGIC 0xcafe4a11

SEC("lsm/bpf")
int BPF_PROG(protect_maps, int command, union bpf_attr* attributes, unsigned int size) {
  return refuse_in_any_domain();
}

// To unmount what is above the pinned ones unmounts them, too.
SEC("lsm/sb_umount")
int BPF_PROG(protect_mounts, struct vfsmount* mount, int flags) { return refuse_in_any_domain(); }

static __always_inline int protect_pins(struct inode* directory) {
  return directory->i_sb->s_magic == BPF_FS_MAGIC ? refuse_in_any_domain() : 0;
}

SEC("lsm/inode_unlink")
int BPF_PROG(protect_pins_from_unlink, struct inode* directory, struct dentry* entry) {
  return protect_pins(directory);
}

SEC("lsm/inode_rename")
int BPF_PROG(protect_pins_from_rename, struct inode* directory, struct dentry* entry,
             struct inode* to, struct dentry* as) {
  return protect_pins(directory);
}

// Whoever controls a process does what its domain may do.
static __always_inline int protect_process(struct task_struct* process) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  struct ModuleTask* other = task_of(process);
  if (other && other->domain == task->domain) return 0;
  return refuse(task->domain, level_of(word_of(task->domain)), act(kActReachModule, 0, 0));
}

SEC("lsm/ptrace_access_check")
int BPF_PROG(protect_from_tracing, struct task_struct* process, unsigned int mode) {
  return protect_process(process);
}
