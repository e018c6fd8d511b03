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

static __always_inline __u32 said_of(__u64 word, __u64 mount, __u64 entry) {
  return has_paths(word) ? path_bits(mount, entry, entry_of(word)) : 0;
}

// What rules of the domain with this word give to a file that is there: its rights in the lower
// half, its label in the upper one.
__noinline __u64 rights_for(__u64 mount, __u64 entry, __u64 word) {
  __u32 label = label_of(entry);
  return (__u64)label << 32 | rights_of(entry_of(word), label, said_of(word, mount, entry));
}

static __always_inline __u64 mount_of_path(const struct path* path) {
  return (__u64)BPF_CORE_READ(path, mnt);
}

static __always_inline __u64 entry_of_path(const struct path* path) {
  return (__u64)BPF_CORE_READ(path, dentry);
}

static __always_inline __u64 mount_of_file(struct file* file) {
  return (__u64)BPF_CORE_READ(file, f_path.mnt);
}

static __always_inline __u64 entry_of_file(struct file* file) {
  return (__u64)BPF_CORE_READ(file, f_path.dentry);
}

// Whether the current process may do something with a file that is there, by its label and by its
// path: `wanted` is of the kUse... of map_entries.h. Files that lie nowhere are not asked about.
__noinline int judge_use(__u64 mount, __u64 entry, __u32 wanted) {
  struct Asker asker = {};
  if (!is_asked(&asker) || !is_mounted((struct dentry*)entry)) return 0;
  __u64 found = rights_for(mount, entry, asker.word);
  if (!(wanted & ~(__u32)found)) return 0;
  return refuse_asker(&asker, act_on_file(kActUseFile, wanted, found >> 32));
}

static __always_inline int may_file(__u64 mount, __u64 entry, __u32 wanted) {
  return judge_use(mount, entry, wanted) ? -EPERM : 0;
}

// The same in hooks that may ask for the path.
static __always_inline int may_use(struct file* file, __u32 wanted) {
  struct Asker asker = {};
  __u64 entry = entry_of_file(file);
  if (!wanted || !is_asked(&asker) || !is_mounted((struct dentry*)entry)) return 0;
  __u64 found = rights_for(mount_of_file(file), entry, asker.word);
  if (!(wanted & ~(__u32)found)) return 0;
  return refuse_asker_path(&asker, act_on_file(kActUseFile, wanted, found >> 32), &file->f_path);
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
  struct ModuleLabelRules* rules = rules_for(entry_of(asker->word), directory_label);
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
  __u32 above = label_of(directory);
  __u32 rights = rights_of(entry_of(asker.word), above, said_of(asker.word, mount, entry));
  __u32 wanted = kind == kMakeSomeSocket ? kMayMakeSocket : 1U << (kMakeShift + (kind & 15));
  __u64 label = new_label(&asker, above, kind);
  bool is_refused = wanted & ~rights && refuse_asker(&asker, making_of(kind, above));
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
  __u32 domain = current_domain();
  if (domain == kNoDomain) return 0;
  int result = check_call_in(domain);
  if (result) return result;
  __u64 place = number_of(entry);
  __u64 name = entry->d_name.hash;
  __u32 kind = kind_of(mode);
  __u32 bound = kind == kMakeSomeSocket ? take_binding() : 0;
  __u64 judged = judge_making(mount_of_path(parent), entry_of_path(parent), place,
                              bound ? kMakeFirstSocket + bound - 1 : kind);
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
  *tag = tag_of_decision(&file->f_path, word, now, how);
  return was_granted(*tag, wanted_of(file));
}

// A file that has no name yet: whoever opens it makes it.
static __always_inline int make_nameless(struct file* file) {
  struct dentry* entry = (struct dentry*)entry_of_file(file);
  __u64 judged = judge_making(mount_of_file(file), (__u64)BPF_CORE_READ(entry, d_parent),
                              (__u64)entry, kMakeRegular);
  if ((__u32)judged) return -EPERM;
  __u32 label = judged >> 32;
  if (!label) return 0;
  if (!has_room()) return -ENOSPC;
  give_label(BPF_CORE_READ(file, f_inode), label);
  return 0;
}

// What of all that is wanted the domain with this word may not do with a file that somebody opens:
// 0 where it may; above that the label. The rights are kept by the tag.
__noinline __u64 judge_opening(__u64 number, __u64 word, __u64 tag, __u32 wanted) {
  struct file* file = (struct file*)number;
  __u64 entry = entry_of_file(file);
  if (!wanted || !is_mounted((struct dentry*)entry)) return 0;
  __u64 found = rights_for(mount_of_file(file), entry, word);
  remember_rights(tag, found);
  return wanted & ~found ? found >> 32 << 32 | wanted : 0;
}

static __always_inline int open_anew(struct Asker* asker, struct file* file, __u64 tag) {
  struct ModuleAct asked = act(kActReachModule, 0, 0);
  if (!is_to_write_past(file)) {
    int result = file->f_flags & O_TMPFILE_FLAG ? make_nameless(file) : 0;
    __u64 judged = result ? 0 : judge_opening(number_of(file), asker->word, tag, wanted_of(file));
    if (!judged) return result;
    asked = act_on_file(kActUseFile, judged, judged >> 32);
  }
  return refuse_asker_path(asker, asked, &file->f_path);
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
  if (is_free(&asker)) return 0;
  // By which call a domain is executed in is asked of the one that is left.
  int result = asker.domain == task->domain ? judge_call(&asker, rules_of(asker.word)) : 0;
  return result ? result : open_anew(&asker, file, tag);
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
  if (!(protection & PROT_EXEC)) return 0;
  struct file* file = BPF_CORE_READ(area, vm_file);
  return file ? may_file(mount_of_file(file), entry_of_file(file), kUseExecute) : 0;
}

SEC("lsm/path_truncate")
int BPF_PROG(truncate_path, const struct path* path) {
  return may_file(mount_of_path(path), entry_of_path(path), kUseTruncate);
}

// Of open files, which older kernels ask the other hook about.
SEC("?lsm/file_truncate")
int BPF_PROG(truncate_file, struct file* file) {
  return may_file(mount_of_file(file), entry_of_file(file), kUseTruncate);
}

// Whoever watches a directory is told the names in it, and of a file what becomes of it; of a whole
// mount or file system, all of that.
SEC("lsm/path_notify")
int BPF_PROG(watch_path, const struct path* path, __u64 mask, unsigned int is_of_more) {
  __u32 domain = current_domain();
  if (domain == kNoDomain) return 0;
  int result = check_call_in(domain);
  if (result) return result;
  __u64 mount = mount_of_path(path);
  __u64 watched = is_of_more ? (__u64)BPF_CORE_READ(path, mnt, mnt_root) : entry_of_path(path);
  struct inode* inode = BPF_CORE_READ((struct dentry*)watched, d_inode);
  return may_file(mount, watched, inode && is_directory(inode) ? kUseList : kUseRead);
}

// ---- Removing and moving them

// Whether the current process may take an entry away.
static __always_inline int remove(const struct path* directory, struct dentry* entry) {
  __u32 domain = current_domain();
  if (domain == kNoDomain) return 0;
  int result = check_call_in(domain);
  if (result) return result;
  result = protect_pins(entry);
  return result ? result : may_file(mount_of_path(directory), number_of(entry), kUseRemove);
}

SEC("lsm/path_unlink")
int BPF_PROG(remove_file, const struct path* directory, struct dentry* entry) {
  return remove(directory, entry);
}

SEC("lsm/path_rmdir")
int BPF_PROG(remove_directory, const struct path* directory, struct dentry* entry) {
  return remove(directory, entry);
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
  __u32 inherited = label_of(move->directory);
  __u32 later = own && inherited != kLabelUnknown ? label_in(*own) : inherited;
  __u32 said = said_of(asker->word, move->mount, move->entry);
  __u32 said_later = said_of(asker->word, move->mount, move->place);
  __u32 rules_entry = entry_of(asker->word);
  __u32 gained = rights_of(rules_entry, later, said_later) & ~rights_of(rules_entry, label, said);
  if (!is_directory(inode)) {
    gained &= kAllUses;
  } else if ((said | said_later) & kPathIsAboveRule) {
    gained = kAllUses;
  }
  return gained ? refuse_asker(asker, act_on_file(kActUseFile, gained & kAllUses, label)) : 0;
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
  __u32 domain = current_domain();
  if (domain == kNoDomain) return 0;
  int result = check_call_in(domain);
  if (result) return result;
  return may_enter(mount_of_path(directory), number_of(entry), entry_of_path(directory),
                   number_of(place));
}

SEC("lsm/path_rename")
int BPF_PROG(move_file, const struct path* directory, struct dentry* entry,
             const struct path* new_directory, struct dentry* place, unsigned int flags) {
  if (current_domain() == kNoDomain) return 0;
  __u64 mount = mount_of_path(directory);
  __u64 from = number_of(entry);
  __u64 to = number_of(place);
  int result = remove(directory, entry);
  if (!result && BPF_CORE_READ(place, d_inode)) result = may_file(mount, to, kUseRemove);
  if (!result) result = may_enter(mount, from, entry_of_path(new_directory), to);
  if (result || !(flags & RENAME_EXCHANGE)) return result;
  return may_enter(mount, to, entry_of_path(directory), from);
}

#endif
