// Rules about files: by their labels, by their paths, and what may be made in directories.
#ifndef FILES_BPF_H
#define FILES_BPF_H

#include "bound_sockets.bpf.h"
#include "decisions.bpf.h"
#include "kernel_helpers.bpf.h"
#include "labels.bpf.h"
#include "paths.bpf.h"
#include "pins.bpf.h"

#define S_IFSOCK 0140000
#define S_IFLNK 0120000
#define S_IFREG 0100000
#define S_IFBLK 0060000
#define S_IFCHR 0020000
#define S_IFIFO 0010000
#define FMODE_READ 1
#define FMODE_WRITE 2
// Of what is opened to be executed.
#define FMODE_EXEC_FLAG 040
#define O_TMPFILE_FLAG 020000000
#define PROT_EXEC 4
#define RENAME_EXCHANGE 2

struct {
  __uint(type, BPF_MAP_TYPE_HASH);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, struct ModuleLabelKey);
  __type(value, struct ModuleLabelRules);
  __uint(max_entries, kMostLabelRules);
} label_rules SEC(".maps");

struct {
  __uint(type, BPF_MAP_TYPE_TASK_STORAGE);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, int);
  __type(value, struct ModuleMaking);
} makings SEC(".maps");

// The domain that the interpreter of a program is executed by: the one that this leads to.
static __always_inline __u32 domain_to_execute(struct ModuleTask* task) {
  struct ModuleTask* own = bpf_task_storage_get(&tasks, bpf_get_current_task_btf(), 0, 0);
  return own && own->next ? own->next - 1 : task->domain;
}

// Namespaces and queues of messages may be mounted, but are reached by their processes and by names
// that are no paths.
#define NSFS_MAGIC 0x6e736673
#define MQUEUE_MAGIC 0x19800202

static __always_inline bool is_mounted(struct dentry* entry) {
  __u64 magic = BPF_CORE_READ(entry, d_sb, s_magic);
  return !(BPF_CORE_READ(entry, d_sb, s_flags) & SB_NOUSER) && magic != NSFS_MAGIC &&
         magic != MQUEUE_MAGIC;
}

static __always_inline struct ModuleLabelRules* rules_for(__u32 rules_entry, __u32 label) {
  struct ModuleLabelKey key = {rules_entry, label};
  return bpf_map_lookup_elem(&label_rules, &key);
}

// The rights that the rules of the entry give to a file at this place, were its label this one; to
// a directory also what may be made in it.
static __always_inline __u32 rights_of(__u32 rules_entry, __u32 label, __u32 said) {
  struct ModuleLabelRules* rules = rules_for(rules_entry, label);
  __u32 granted = rules ? rules->granted : 0;
  __u32 refused = rules ? rules->refused : 0;
  if (said & kPathHasRule) {
    __u32 permitted = (said & kPathRead ? kRightsToRead : 0) |
                      (said & kPathWrite ? kRightsToWrite | kMayMakeDevice : 0) |
                      (said & kPathExecute ? kRightsToExecute : 0);
    granted |= permitted & ~kMayMakeDevice;
    refused |= ~permitted;
  }
  return granted & ~refused;
}

static __always_inline __u32 said_of(struct Asker* asker, __u64 mount, __u64 entry) {
  return has_paths(asker) ? path_bits(mount, entry, asker->entry) : 0;
}

// Of a file that is there: its rights in the lower half, its label in the upper one.
static __always_inline __u64 rights_at(__u64 mount, __u64 entry, __u32 rules_entry,
                                       __u32 is_by_path) {
  __u32 label = label_of(entry);
  __u32 said = is_by_path ? path_bits(mount, entry, rules_entry) : 0;
  return (__u64)label << 32 | rights_of(rules_entry, label, said);
}

static __always_inline __u64 rights_for(struct Asker* asker, __u64 mount, __u64 entry) {
  return rights_at(mount, entry, asker->entry, has_paths(asker));
}

static __always_inline int judge_file(struct Asker* asker, __u64 mount, __u64 entry, __u32 wanted) {
  __u64 found = rights_for(asker, mount, entry);
  if (!(wanted & ~(__u32)found)) return 0;
  return refuse(asker->domain, asker->level, act_on_file(kActUseFile, wanted, found >> 32));
}

// The same in hooks that may ask for the path.
static __always_inline int judge_open_file(struct Asker* asker, struct file* file, __u32 wanted,
                                           __u32* rights) {
  struct path* path = &file->f_path;
  __u64 found = rights_for(asker, number_of(path->mnt), number_of(path->dentry));
  *rights = found;
  if (!(wanted & ~(__u32)found)) return 0;
  return refuse_path(asker->domain, asker->level, act_on_file(kActUseFile, wanted, found >> 32),
                     path);
}

// Whether the current process may do something with a file that is there, by its label and by its
// path: `wanted` is of the kUse... of map_entries.h. Files that lie nowhere are not asked about.
__noinline int judge_use(__u64 mount, __u64 entry, __u32 wanted) {
  struct Asker asker = {};
  if (!is_asked(&asker) || !is_mounted((struct dentry*)entry)) return 0;
  return judge_file(&asker, mount, entry, wanted);
}

static __always_inline int may_file(struct vfsmount* mount, struct dentry* entry, __u32 wanted) {
  return judge_use(number_of(mount), number_of(entry), wanted) ? -EPERM : 0;
}

// The same in hooks that may ask for the path.
static __always_inline int may_use(struct file* file, __u32 wanted) {
  struct Asker asker = {};
  __u32 rights = 0;
  if (!wanted || !is_asked(&asker) || !is_mounted(file->f_path.dentry)) return 0;
  return judge_open_file(&asker, file, wanted, &rights);
}

// ---- Making files

// Behind the kinds of files those of sockets, in their order, and one of which nobody knows: the
// file does not tell.
enum {
  kMakeFirstSocket = kMakeBlockDevice + 1,
  kMakeSomeSocket = kMakeFirstSocket + kSocketSeqpacket + 1,
};

static __always_inline __u32 kind_of(__u32 mode) {
  switch (mode & S_IFMT) {
    case S_IFDIR:
      return kMakeDirectory;
    case S_IFLNK:
      return kMakeSymlink;
    case S_IFIFO:
      return kMakeFifo;
    case S_IFCHR:
      return kMakeCharDevice;
    case S_IFBLK:
      return kMakeBlockDevice;
    case S_IFSOCK:
      return kMakeSomeSocket;
  }
  return kMakeRegular;
}

// Nothing for that of the directory.
static __always_inline __u32 new_label(struct Asker* asker, __u32 directory_label, __u32 kind) {
  struct ModuleLabelRules* rules = rules_for(asker->entry, directory_label);
  __u64 index = kind;
  // What is compared and what is used are the same for the verifier then.
  asm volatile("" : "+r"(index));
  return rules && index < kLabelledKinds ? rules->newLabels[index] : 0;
}

static __always_inline struct ModuleAct making_of(__u32 kind, __u32 above) {
  if (kind < kMakeFirstSocket) return act_on_file(kActMakeFile, kind, above);
  bool is_some = kind == kMakeSomeSocket;
  return act_on_file(kActMakeSocket, is_some ? kSocketStream : kind - kMakeFirstSocket, above);
}

// Whether the current process may make an entry of this kind in the directory: above the result,
// which is not 0 where it may not, the label that the entry is to have.
__noinline __u64 judge_making(__u64 mount, __u64 directory, __u64 entry, __u32 kind) {
  struct Asker asker = {};
  if (!is_asked(&asker)) return 0;
  __u32 above = label_of_directory(directory);
  __u32 rights = rights_of(asker.entry, above, said_of(&asker, mount, entry));
  __u32 wanted = kind == kMakeSomeSocket ? kMayMakeSocket : 1U << (kMakeShift + (kind & 15));
  __u64 label = new_label(&asker, above, kind);
  bool is_refused = wanted & ~rights && refuse(asker.domain, asker.level, making_of(kind, above));
  return label << 32 | is_refused;
}

// Room for one more label is found before the file is made.
static __always_inline bool has_room(void) {
  struct ModuleFile none = {bpf_get_current_pid_tgid(), 0, 0};
  __u32 label = kLabelUnknown;
  if (bpf_map_update_elem(&labels, &none, &label, BPF_ANY)) return false;
  bpf_map_delete_elem(&labels, &none);
  return true;
}

// What it is to be labelled is kept for when there is something to label.
static __always_inline int keep_label(__u64 entry, __u64 name, __u32 label) {
  struct ModuleMaking making = {entry, name, label};
  struct task_struct* thread = bpf_get_current_task_btf();
  struct ModuleMaking* former = bpf_task_storage_get(&makings, thread, 0, 0);
  if (former) former->label = 0;
  if (!label) return 0;
  if (!has_room()) return -ENOSPC;
  former = bpf_task_storage_get(&makings, thread, &making, BPF_LOCAL_STORAGE_GET_F_CREATE);
  if (!former) return -ENOMEM;
  *former = making;
  return 0;
}

static __always_inline int make(const struct path* parent, struct dentry* entry, __u32 mode) {
  if (!current_task()) return 0;
  __u64 place = number_of(entry);
  __u64 mount = number_of(parent->mnt);
  __u64 directory = number_of(parent->dentry);
  __u64 name = entry->d_name.hash;
  int result = check_call();
  if (result) return result;
  __u32 kind = kind_of(mode);
  __u32 bound = kind == kMakeSomeSocket ? take_binding() : 0;
  __u64 judged = judge_making(mount, directory, place, bound ? kMakeFirstSocket + bound - 1 : kind);
  return (__u32)judged ? -EPERM : keep_label(place, name, judged >> 32);
}

// Of what is new nobody knows anything yet.
static __always_inline void give_label(struct inode* inode, __u32 label) {
  struct ModuleFile key = key_of(inode);
  label |= kLabelIsUnwritten;
  bpf_map_update_elem(&labels, &key, &label, BPF_NOEXIST);
}

// Before anybody else finds the file.
SEC("lsm/d_instantiate")
int BPF_PROG(label_new_file, struct dentry* entry, struct inode* inode) {
  struct ModuleMaking* making = bpf_task_storage_get(&makings, bpf_get_current_task_btf(), 0, 0);
  if (!making || !making->label || !inode) return 0;
  if (making->entry == number_of(entry) && making->name == entry->d_name.hash)
    give_label(inode, making->label);
  making->label = 0;
  return 0;
}

SEC("lsm/path_mknod")
int BPF_PROG(make_file, const struct path* directory, struct dentry* entry, unsigned short mode) {
  return make(directory, entry, mode);
}

SEC("lsm/path_mkdir")
int BPF_PROG(make_directory, const struct path* directory, struct dentry* entry) {
  return make(directory, entry, S_IFDIR);
}

SEC("lsm/path_symlink")
int BPF_PROG(make_link, const struct path* directory, struct dentry* entry) {
  return make(directory, entry, S_IFLNK);
}

// ---- Using files

static __always_inline __u32 wanted_of(struct file* file) {
  __u32 flags = file->f_flags;
  __u32 mode = file->f_mode;
  if (flags & FMODE_EXEC_FLAG) return kUseExecute;
  if ((file->f_inode->i_mode & S_IFMT) == S_IFDIR) return mode & FMODE_READ ? kUseList : 0;
  return (mode & FMODE_READ ? kUseRead : 0) | (mode & FMODE_WRITE ? kUseWrite : 0);
}

// What lies below all file systems would be changed, or what the kernel executes by itself.
static __always_inline bool is_to_write_past(struct file* file) {
  if (!(file->f_mode & FMODE_WRITE)) return false;
  struct inode* inode = file->f_inode;
  return (inode->i_mode & S_IFMT) == S_IFBLK || names_helper(number_of(file), inode->i_sb->s_magic);
}

// A file that has no name yet: whoever opens it makes it.
static __always_inline int make_nameless(struct file* file) {
  struct dentry* entry = file->f_path.dentry;
  __u64 judged = judge_making(number_of(file->f_path.mnt), number_of(entry->d_parent),
                              number_of(entry), kMakeRegular);
  if ((__u32)judged) return -EPERM;
  __u32 label = judged >> 32;
  if (!label) return 0;
  if (!has_room()) return -ENOSPC;
  give_label(file->f_inode, label);
  return 0;
}

// Whether that is what the domain was allowed before. Of what it depends on, the tag is kept.
static __always_inline bool may_open_again(struct task_struct* thread, __u32 domain,
                                           struct file* file, __u64* tag) {
  struct ModuleHashing* how = how_to_hash();
  if (!how) return false;
  __u64 now = epoch_of(how);
  __u64 word = word_of(domain);
  if (level_of(word) == kLevelDisabled) return true;
  struct ModuleRules* granted = rules_of(word);
  if (!granted || !is_call_granted(granted, call_of(thread)) || is_to_write_past(file))
    return false;
  *tag = tag_of_decision(&file->f_path, word >> kEntryShift, granted->hasPaths, now, how);
  return was_granted(*tag, wanted_of(file));
}

static __always_inline int judge_opening(struct Asker* asker, struct file* file, __u64 tag) {
  if (is_to_write_past(file))
    return refuse_path(asker->domain, asker->level, act(kActReachModule, 0, 0), &file->f_path);
  if (!is_mounted(file->f_path.dentry)) return 0;
  int result = file->f_flags & O_TMPFILE_FLAG ? make_nameless(file) : 0;
  __u32 wanted = wanted_of(file);
  if (result || !wanted) return result;
  __u32 rights = 0;
  result = judge_open_file(asker, file, wanted, &rights);
  remember_rights(tag, rights);
  return result;
}

SEC("lsm/file_open")
int BPF_PROG(open_file, struct file* file) {
  struct task_struct* thread = bpf_get_current_task_btf();
  struct ModuleTask* task = task_of(thread);
  if (!task) return 0;
  bool is_to_execute = file->f_flags & FMODE_EXEC_FLAG;
  __u64 tag = 0;
  if (!is_to_execute && may_open_again(thread, task->domain, file, &tag)) return 0;
  struct Asker asker = {};
  ask_for(&asker, is_to_execute ? domain_to_execute(task) : task->domain);
  if (asker.level == kLevelDisabled) return 0;
  // By which call a domain is executed in is asked of the one that is left.
  int result = asker.domain == task->domain ? judge_call_of(&asker) : 0;
  return result ? result : judge_opening(&asker, file, tag);
}

SEC("lsm/file_receive")
int BPF_PROG(receive_file, struct file* file) { return may_use(file, wanted_of(file)); }

SEC("lsm/mmap_file")
int BPF_PROG(map_file, struct file* file, unsigned long asked, unsigned long protection) {
  if (!file || !(protection & PROT_EXEC)) return 0;
  return may_use(file, kUseExecute);
}

SEC("lsm/file_mprotect")
int BPF_PROG(protect_mapping, struct vm_area_struct* area, unsigned long asked,
             unsigned long protection) {
  struct file* file = area->vm_file;
  if (!file || !(protection & PROT_EXEC)) return 0;
  return may_file(file->f_path.mnt, file->f_path.dentry, kUseExecute);
}

SEC("lsm/path_truncate")
int BPF_PROG(truncate_path, const struct path* path) {
  return may_file(path->mnt, path->dentry, kUseTruncate);
}

// Of open files, which older kernels ask the other hook about.
SEC("?lsm/file_truncate")
int BPF_PROG(truncate_file, struct file* file) {
  return may_file(file->f_path.mnt, file->f_path.dentry, kUseTruncate);
}

// Whoever watches a directory is told the names in it, and of a file what becomes of it; of a whole
// mount or file system, all of that.
SEC("lsm/path_notify")
int BPF_PROG(watch_path, const struct path* path, __u64 mask, unsigned int is_of_more) {
  if (!current_task()) return 0;
  int result = check_call();
  if (result) return result;
  struct vfsmount* mount = path->mnt;
  __u64 watched = is_of_more ? number_of(mount->mnt_root) : number_of(path->dentry);
  struct inode* inode = BPF_CORE_READ((struct dentry*)watched, d_inode);
  __u32 wanted = inode && is_directory(inode) ? kUseList : kUseRead;
  return judge_use(number_of(mount), watched, wanted) ? -EPERM : 0;
}

// ---- Removing and moving them

SEC("lsm/path_unlink")
int BPF_PROG(remove_file, const struct path* directory, struct dentry* entry) {
  if (!current_task()) return 0;
  int result = check_call();
  if (!result) result = protect_pins(entry);
  return result ? result : may_file(directory->mnt, entry, kUseRemove);
}

SEC("lsm/path_rmdir")
int BPF_PROG(remove_directory, const struct path* directory, struct dentry* entry) {
  if (!current_task()) return 0;
  int result = check_call();
  if (!result) result = protect_pins(entry);
  return result ? result : may_file(directory->mnt, entry, kUseRemove);
}

// A file, and the place that it is to have.
struct Move {
  __u64 mount;
  __u64 entry;
  __u64 directory;  // of the place
  __u64 place;
};

// Whoever gives a file a second place is allowed no more with it there than where it is, nor with
// what is beneath it.
static __always_inline int judge_place(struct Asker* asker, struct Move* move,
                                       struct inode* inode) {
  __u32 label = label_of(move->entry);
  __u32* own = own_label(inode);
  __u32 inherited = label_of_directory(move->directory);
  __u32 later = own && inherited != kLabelUnknown ? label_in(*own) : inherited;
  __u32 said = said_of(asker, move->mount, move->entry);
  __u32 said_later = said_of(asker, move->mount, move->place);
  __u32 gained = rights_of(asker->entry, later, said_later) & ~rights_of(asker->entry, label, said);
  if (!is_directory(inode)) {
    gained &= kAllUses;
  } else if ((said | said_later) & kPathIsAboveRule) {
    gained = kAllUses;
  }
  return gained ? refuse(asker->domain, asker->level,
                         act_on_file(kActUseFile, gained & kAllUses, label))
                : 0;
}

// Makes an entry of a file that there is. It keeps the label that it has.
__noinline int judge_entry(__u64 mount, __u64 entry, __u64 directory, __u64 place) {
  struct inode* inode = BPF_CORE_READ((struct dentry*)entry, d_inode);
  struct Asker asker = {};
  if (!inode || !is_asked(&asker)) return 0;
  struct Move move = {mount, entry, directory, place};
  __u64 judged = judge_making(mount, directory, place, kind_of(BPF_CORE_READ(inode, i_mode)));
  return (__u32)judged ? -EPERM : judge_place(&asker, &move, inode);
}

static __always_inline int may_enter(__u64 mount, __u64 entry, __u64 directory, __u64 place) {
  return judge_entry(mount, entry, directory, place) ? -EPERM : 0;
}

SEC("lsm/path_link")
int BPF_PROG(link_file, struct dentry* entry, const struct path* directory, struct dentry* place) {
  if (!current_task()) return 0;
  int result = check_call();
  return result ? result
                : may_enter(number_of(directory->mnt), number_of(entry),
                            number_of(directory->dentry), number_of(place));
}

SEC("lsm/path_rename")
int BPF_PROG(move_file, const struct path* directory, struct dentry* entry,
             const struct path* new_directory, struct dentry* place, unsigned int flags) {
  if (!current_task()) return 0;
  int result = check_call();
  if (!result) result = protect_pins(entry);
  if (!result) result = may_file(directory->mnt, entry, kUseRemove);
  if (!result && place->d_inode) result = may_file(directory->mnt, place, kUseRemove);
  if (result) return result;
  __u64 mount = number_of(directory->mnt);
  __u64 from = number_of(entry);
  __u64 to = number_of(place);
  result = may_enter(mount, from, number_of(new_directory->dentry), to);
  if (result || !(flags & RENAME_EXCHANGE)) return result;
  return may_enter(mount, to, number_of(directory->dentry), from);
}

#endif
