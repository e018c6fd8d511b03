// Which domain a process enters by executing a program: that which the label of the program leads
// to, else that which its tardisk leads to, else it stays in its own.
#ifndef EXECUTION_BPF_H
#define EXECUTION_BPF_H

#include "entering.bpf.h"
#include "files.bpf.h"

#define MNT_NOSUID 0x01
#define BYTES_OF_SCRIPT_PATH 256

// The labels of the tardisks that files came from.
struct {
  __uint(type, BPF_MAP_TYPE_HASH);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, struct ModuleFile);
  __type(value, __u32);
  __uint(max_entries, kMostTardiskFiles);
} tardisk_files SEC(".maps");

struct TwoPaths {
  char asked[BYTES_OF_SCRIPT_PATH];
  char real[BYTES_OF_SCRIPT_PATH];
};

// What the current thread is in, as its own: whichever thread executes a program is the first one
// then, and what was known of the former is gone. Null with `*is_placed` where there is no room.
static __always_inline struct ModuleTask* own_task(bool* is_placed) {
  struct task_struct* thread = bpf_get_current_task_btf();
  struct ModuleTask* process = task_of(thread);
  *is_placed = process != 0;
  if (!process) return 0;
  struct ModuleTask same = {process->domain, 0};
  struct ModuleTask* own =
      bpf_task_storage_get(&tasks, thread, &same, BPF_LOCAL_STORAGE_GET_F_CREATE);
  if (!own) return 0;
  own->next = 0;
  __u64 number = bpf_get_current_pid_tgid();
  bool is_first = number >> 32 == (__u32)number;
  if (!is_first) own->domain = same.domain;
  return own;
}

// Whoever traces a process, shares what it sees of the file system or has chosen that for it would
// have the next domain do what he wants; and what may get no more privileges gets none.
static __always_inline bool is_controlled(struct linux_binprm* program) {
  struct task_struct* thread = bpf_get_current_task_btf();
  return program->unsafe || BPF_CORE_READ(program, file, f_path.mnt, mnt_flags) & MNT_NOSUID ||
         BPF_CORE_READ(thread, cred, user_ns, level);
}

static __always_inline __u32 domain_behind_tardisk(__u32 rules_entry, struct inode* inode) {
  struct ModuleFile key = key_of(inode);
  __u32* label = bpf_map_lookup_elem(&tardisk_files, &key);
  struct ModuleLabelRules* rules = label ? rules_for(rules_entry, *label) : 0;
  return rules ? rules->nextOfTardisk : 0;
}

// 0 where the program leads nowhere, else the domain, one higher. Where its own label would lead
// cannot be told of one that nobody knows.
static __always_inline __u32 domain_behind(__u32 rules_entry, __u32 label, struct inode* inode) {
  struct ModuleLabelRules* rules = rules_for(rules_entry, label);
  if (rules && rules->next) return rules->next;
  return label == kLabelUnknown ? 0 : domain_behind_tardisk(rules_entry, inode);
}

static __always_inline struct ModuleAct entry_into(__u32 next, __u32 label) {
  struct ModuleAct asked = {kActEnter, 0, next - 1, label};
  return asked;
}

// By label and path. What has no place in any file system no rule is about.
static __always_inline bool is_executable(struct Asker* asker, struct file* file) {
  if (is_free(asker)) return true;
  __u64 entry = entry_of_file(file);
  if (!is_mounted((struct dentry*)entry)) return false;
  return rights_for(mount_of_file(file), entry, asker->word) & kUseExecute;
}

SEC("lsm/bprm_creds_for_exec")
int BPF_PROG(choose_domain, struct linux_binprm* program) {
  if (loses_entry()) return -EPERM;
  bool is_placed = false;
  struct ModuleTask* own = own_task(&is_placed);
  if (!own) return is_placed ? -ENOMEM : 0;
  struct Asker asker = {};
  ask_for(&asker, own->domain);
  struct file* file = program->file;
  __u32 label = label_of(entry_of_file(file));
  if (!is_executable(&asker, file)) {
    struct ModuleAct asked = act_on_file(kActUseFile, kUseExecute, label);
    int result = refuse_asker_path(&asker, asked, &file->f_path);
    if (result) return result;
  }
  __u32 next = domain_behind(entry_of(asker.word), label, file->f_inode);
  if (!next) return 0;
  if (level_of(word_of(next - 1)) == kLevelAbsent || is_controlled(program))
    return refuse_asker_path(&asker, entry_into(next, label), &file->f_path);
  own->next = next;
  return bpf_bprm_opts_set(program, BPF_F_BPRM_SECUREEXEC) ? -EPERM : 0;
}

static __always_inline bool is_same_path(struct TwoPaths* paths) {
  for (int index = 0; index < BYTES_OF_SCRIPT_PATH; index++) {
    if (paths->asked[index] != paths->real[index]) return false;
    if (!paths->asked[index]) return true;
  }
  return false;
}

// Whether the program was executed by the path that it really has. Longer ones are never.
static __always_inline bool is_by_real_path(struct linux_binprm* program) {
  struct TwoPaths* paths = bpf_ringbuf_reserve(&events, sizeof(*paths), 0);
  if (!paths) return false;
  bool is_same =
      bpf_probe_read_kernel_str(paths->asked, sizeof(paths->asked), program->filename) > 0 &&
      bpf_d_path(&program->file->f_path, paths->real, sizeof(paths->real)) > 0 &&
      is_same_path(paths);
  bpf_ringbuf_discard(paths, 0);
  return is_same;
}

// What has an interpreter is opened once more by the path that it was asked for by, which may lead
// to another file by then.
SEC("lsm/bprm_check_security")
int BPF_PROG(check_script, struct linux_binprm* program) {
  struct ModuleTask* own = bpf_task_storage_get(&tasks, bpf_get_current_task_btf(), 0, 0);
  if (!own || !own->next || program->interp != program->filename) return 0;
  bool is_machine_code = program->buf[0] == 0x7f && program->buf[1] == 'E';
  if (is_machine_code || is_by_real_path(program)) return 0;
  struct Asker asker = {};
  ask_for(&asker, own->domain);
  struct file* file = program->file;
  __u32 next = own->next;
  own->next = 0;
  struct ModuleAct asked = entry_into(next, label_of(entry_of_file(file)));
  return refuse_asker_path(&asker, asked, &file->f_path);
}

// From here on nothing of the former program is left, and this one cannot fail anymore.
SEC("lsm/bprm_committed_creds")
int BPF_PROG(enter_domain, struct linux_binprm* program) {
  if (enter_as_asked()) return 0;
  struct ModuleTask* own = bpf_task_storage_get(&tasks, bpf_get_current_task_btf(), 0, 0);
  if (!own || !own->next) return 0;
  own->domain = own->next - 1;
  own->next = 0;
  return 0;
}

#endif
