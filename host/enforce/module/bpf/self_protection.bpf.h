// What would undo all this: nobody in a domain may reach programs and maps, nor act as one who can.
#ifndef SELF_PROTECTION_BPF_H
#define SELF_PROTECTION_BPF_H

#include "identities.bpf.h"

SEC("lsm/bpf")
int BPF_PROG(protect_maps, int command, union bpf_attr* attributes, unsigned int size) {
  return refuse_in_any_domain();
}

// ---- What is mounted

// To unmount what is above the pinned ones unmounts them, too, and to mount over them hides them.
// Rules about paths take them as they are in the whole machine.
SEC("lsm/sb_umount")
int BPF_PROG(protect_mounts, struct vfsmount* mount, int flags) { return refuse_in_any_domain(); }

SEC("lsm/sb_mount")
int BPF_PROG(protect_from_mount, const char* device, const struct path* path, const char* type,
             unsigned long flags, void* data) {
  return refuse_in_any_domain();
}

SEC("lsm/move_mount")
int BPF_PROG(protect_from_moved_mount, const struct path* from, const struct path* to) {
  return refuse_in_any_domain();
}

SEC("lsm/sb_pivotroot")
int BPF_PROG(protect_from_new_root, const struct path* from, const struct path* to) {
  return refuse_in_any_domain();
}

// ---- The file system of programs and maps

#define BPF_FS_MAGIC 0xcafe4a11

static __always_inline int protect_pins(struct inode* inode) {
  return inode->i_sb->s_magic == BPF_FS_MAGIC ? refuse_in_any_domain() : 0;
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

static __always_inline int protect_pinned(const struct path* path) {
  struct inode* inode = path->dentry->d_inode;
  return inode ? protect_pins(inode) : 0;
}

SEC("lsm/path_chmod")
int BPF_PROG(protect_pins_from_mode, const struct path* path, unsigned short mode) {
  return protect_pinned(path);
}

SEC("lsm/path_chown")
int BPF_PROG(protect_pins_from_owner, const struct path* path) { return protect_pinned(path); }

// ---- Other processes

// Whoever asks in this way will not be told of a refusal, and is not counted.
#define PTRACE_MODE_NOAUDIT 0x04

static __always_inline bool is_in(__u32 domain, struct task_struct* process) {
  struct ModuleTask* task = task_of(process);
  return task && task->domain == domain;
}

// Whoever controls a process does what its domain may do.
static __always_inline int protect_process(struct task_struct* process) {
  struct ModuleTask* task = current_task();
  if (!task || is_in(task->domain, process)) return 0;
  return refuse(task->domain, level_of(word_of(task->domain)), act(kActReachModule, 0, 0));
}

SEC("lsm/ptrace_access_check")
int BPF_PROG(protect_from_tracing, struct task_struct* process, unsigned int mode) {
  if (!(mode & PTRACE_MODE_NOAUDIT)) return protect_process(process);
  struct ModuleTask* task = current_task();
  if (!task || is_in(task->domain, process)) return 0;
  return is_enforced(level_of(word_of(task->domain))) ? -EPERM : 0;
}

// Here it is the other one who would control this process.
SEC("lsm/ptrace_traceme")
int BPF_PROG(protect_from_asked_tracing, struct task_struct* tracer) {
  struct ModuleTask* other = task_of(tracer);
  if (!other || is_in(other->domain, bpf_get_current_task_btf())) return 0;
  return refuse(other->domain, level_of(word_of(other->domain)), act(kActReachModule, 0, 0));
}

// A limit of processor time that is over ends a process.
SEC("lsm/task_setrlimit")
int BPF_PROG(protect_from_limits, struct task_struct* process, unsigned int resource) {
  return protect_process(process);
}

// ---- The kernel

// Of what is read or loaded for the kernel, all that is no firmware becomes a part of it.
#define FIRMWARE 1

SEC("lsm/kernel_read_file")
int BPF_PROG(protect_from_read_code, struct file* file, int what, bool is_contents) {
  return what == FIRMWARE ? 0 : refuse_in_any_domain();
}

SEC("lsm/kernel_load_data")
int BPF_PROG(protect_from_loaded_code, int what, bool is_contents) {
  return what == FIRMWARE ? 0 : refuse_in_any_domain();
}

// What a kernel that is locked down refuses everybody: memory, ports and tables of the machine, and
// ways to trace the kernel.
SEC("lsm/locked_down")
int BPF_PROG(protect_memory, int what) { return refuse_in_any_domain(); }

SEC("lsm/perf_event_open")
int BPF_PROG(protect_from_counters, void* attributes, int type) { return refuse_in_any_domain(); }

// ---- What the kernel executes by itself, in no domain

#define FMODE_WRITE 2
#define PROC_SUPER_MAGIC 0x9fa0
#define CGROUP_SUPER_MAGIC 0x27e0eb

#define LONGEST_NAME 24

static __always_inline bool names_helper(unsigned long system, struct dentry* entry) {
  char name[LONGEST_NAME] = {};
  bpf_probe_read_kernel_str(name, sizeof(name), entry->d_name.name);
  if (system == CGROUP_SUPER_MAGIC) return !bpf_strncmp(name, sizeof(name), "release_agent");
  return !bpf_strncmp(name, sizeof(name), "core_pattern") ||
         !bpf_strncmp(name, sizeof(name), "modprobe") ||
         !bpf_strncmp(name, sizeof(name), "poweroff_cmd") ||
         !bpf_strncmp(name, sizeof(name), "hotplug");
}

SEC("lsm/file_open")
int BPF_PROG(protect_helpers, struct file* file) {
  if (!(file->f_mode & FMODE_WRITE)) return 0;
  unsigned long system = file->f_inode->i_sb->s_magic;
  if (system != PROC_SUPER_MAGIC && system != CGROUP_SUPER_MAGIC) return 0;
  if (!current_task() || !names_helper(system, file->f_path.dentry)) return 0;
  return refuse_in_any_domain();
}

// To have a key made the kernel executes a program.
SEC("lsm/key_alloc")
int BPF_PROG(protect_from_made_keys, struct key* key, const struct cred* owner,
             unsigned long flags) {
  if (!current_task()) return 0;
  char type[LONGEST_NAME] = {};
  bpf_probe_read_kernel_str(type, sizeof(type), key->type->name);
  return bpf_strncmp(type, sizeof(type), ".request_key_auth") ? 0 : refuse_in_any_domain();
}

// ---- Rings

// What a ring does for who has left it its rights.
SEC("lsm/uring_override_creds")
int BPF_PROG(act_as_other, const struct cred* other) {
  const struct cred* own = bpf_get_current_task_btf()->cred;
  int result = check_users(other, own);
  return result ? result : check_groups(other, own);
}

SEC("lsm/uring_cmd")
int BPF_PROG(use_ring_command, struct io_uring_cmd* command) {
  return check_value(kCheckIoctl, command->cmd_op);
}

#endif
