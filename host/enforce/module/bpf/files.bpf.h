// Rules about files: by their labels, by their paths, and what may be made in directories.
#ifndef FILES_BPF_H
#define FILES_BPF_H

#include "bound_sockets.bpf.h"
#include "labels.bpf.h"
#include "paths.bpf.h"

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

// Who asks, and by which rules.
struct Asker {
  __u32 domain;
  __u32 level;
  __u32 entry;
  bool has_paths;
};

static __always_inline void ask_for(struct Asker* asker, __u32 domain) {
  __u64 word = word_of(domain);
  asker->domain = domain;
  asker->level = level_of(word);
  asker->entry = word >> kEntryShift;
  struct ModuleRules* granted = rules_of(word);
  asker->has_paths = granted && granted->hasPaths;
}

// False for who may do everything.
static __always_inline bool is_asked(struct Asker* asker) {
  struct ModuleTask* task = current_task();
  if (!task) return false;
  ask_for(asker, task->domain);
  return asker->level != kLevelDisabled;
}

// The interpreter of a program is executed by the domain that this leads to.
static __always_inline bool is_asked_to_open(struct Asker* asker, struct file* file) {
  if (!(file->f_flags & FMODE_EXEC_FLAG)) return is_asked(asker);
  struct ModuleTask* own = bpf_task_storage_get(&tasks, bpf_get_current_task_btf(), 0, 0);
  if (!own || !own->next) return is_asked(asker);
  ask_for(asker, own->next - 1);
  return asker->level != kLevelDisabled;
}

// Namespaces may be mounted, but are reached by their processes.
#define NSFS_MAGIC 0x6e736673

static __always_inline bool is_mounted(struct dentry* entry) {
  struct super_block* file_system = entry->d_sb;
  return !(file_system->s_flags & SB_NOUSER) && file_system->s_magic != NSFS_MAGIC;
}

static __always_inline struct ModuleLabelRules* rules_for(struct Asker* asker, __u32 label) {
  struct ModuleLabelKey key = {asker->entry, label};
  return bpf_map_lookup_elem(&label_rules, &key);
}

// The rights that the rules of the asker give to a file at this place, were its label this one; to
// a directory also what may be made in it.
static __always_inline __u32 rights_of(struct Asker* asker, __u32 label, __u32 said) {
  if (asker->level == kLevelAbsent) return 0;
  struct ModuleLabelRules* rules = rules_for(asker, label);
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

static __always_inline __u32 said_of(struct Asker* asker, struct vfsmount* mount,
                                     struct dentry* entry) {
  return asker->has_paths ? path_bits(mount, entry, asker->entry) : 0;
}

// Of what is wanted that which the asker may not do with a file that is there.
static __always_inline __u32 lacking(struct Asker* asker, struct vfsmount* mount,
                                     struct dentry* entry, __u32 wanted, __u32* label) {
  *label = label_of(entry);
  return wanted & ~rights_of(asker, *label, said_of(asker, mount, entry));
}

static __always_inline int judge_file(struct Asker* asker, struct vfsmount* mount,
                                      struct dentry* entry, __u32 wanted) {
  __u32 label = kLabelUnknown;
  if (!lacking(asker, mount, entry, wanted, &label)) return 0;
  return refuse(asker->domain, asker->level, act_on_file(kActUseFile, wanted, label));
}

// The same in hooks that may ask for the path.
static __always_inline int judge_open_file(struct Asker* asker, struct file* file, __u32 wanted) {
  struct path* path = &file->f_path;
  __u32 label = kLabelUnknown;
  if (!wanted || !lacking(asker, path->mnt, path->dentry, wanted, &label)) return 0;
  return refuse_path(asker->domain, asker->level, act_on_file(kActUseFile, wanted, label), path);
}

// Whether the current process may do something with a file that is there, by its label and by its
// path: `wanted` is of the kUse... of map_entries.h. Files that lie nowhere are not asked about.
static __noinline int may_file(struct vfsmount* mount, struct dentry* entry, __u32 wanted) {
  struct Asker asker = {};
  if (!wanted || !is_asked(&asker) || !is_mounted(entry)) return 0;
  return judge_file(&asker, mount, entry, wanted);
}

// The same in hooks that may ask for the path.
static __always_inline int may_use(struct file* file, __u32 wanted) {
  struct Asker asker = {};
  if (!wanted || !is_asked(&asker) || !is_mounted(file->f_path.dentry)) return 0;
  return judge_open_file(&asker, file, wanted);
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
  struct ModuleLabelRules* rules = rules_for(asker, directory_label);
  __u64 index = kind;
  // What is compared and what is used are the same for the verifier then.
  asm volatile("" : "+r"(index));
  return rules && index < kLabelledKinds ? rules->newLabels[index] : 0;
}

// Whether the asker may make an entry of this kind in the directory. What it is to be labelled is
// kept for when there is something to label.
static __always_inline int judge_making(struct Asker* asker, struct vfsmount* mount,
                                        struct dentry* directory, struct dentry* entry, __u32 kind,
                                        __u32* label) {
  __u32 above = label_of_directory(directory);
  __u32 rights = rights_of(asker, above, said_of(asker, mount, entry));
  bool is_some = kind == kMakeSomeSocket;
  __u32 wanted = is_some ? kMayMakeSocket : 1U << (kMakeShift + (kind & 15));
  __u32 socket = is_some ? kSocketStream : kind - kMakeFirstSocket;
  *label = new_label(asker, above, kind);
  if (!(wanted & ~rights)) return 0;
  return refuse(asker->domain, asker->level,
                kind >= kMakeFirstSocket ? act_on_file(kActMakeSocket, socket, above)
                                         : act_on_file(kActMakeFile, kind, above));
}

// Room for one more label is found before the file is made.
static __always_inline bool has_room(void) {
  struct ModuleFile none = {bpf_get_current_pid_tgid(), 0, 0};
  __u32 label = kLabelUnknown;
  if (bpf_map_update_elem(&labels, &none, &label, BPF_ANY)) return false;
  bpf_map_delete_elem(&labels, &none);
  return true;
}

static __noinline int make(struct vfsmount* mount, struct dentry* directory, struct dentry* entry,
                           __u32 mode) {
  struct Asker asker = {};
  if (!is_asked(&asker)) return 0;
  __u32 kind = kind_of(mode);
  __u32 bound = kind == kMakeSomeSocket ? take_binding() : 0;
  if (bound) kind = kMakeFirstSocket + bound - 1;
  struct ModuleMaking making = {(__u64)entry, entry->d_name.hash, 0};
  int result = judge_making(&asker, mount, directory, entry, kind, &making.label);
  if (result) return result;
  struct task_struct* thread = bpf_get_current_task_btf();
  struct ModuleMaking* former = bpf_task_storage_get(&makings, thread, 0, 0);
  if (former) former->label = 0;
  if (!making.label) return 0;
  if (!has_room()) return -ENOSPC;
  former = bpf_task_storage_get(&makings, thread, &making, BPF_LOCAL_STORAGE_GET_F_CREATE);
  if (!former) return -ENOMEM;
  *former = making;
  return 0;
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
  if (making->entry == (__u64)entry && making->name == entry->d_name.hash)
    give_label(inode, making->label);
  making->label = 0;
  return 0;
}

SEC("lsm/path_mknod")
int BPF_PROG(make_file, const struct path* directory, struct dentry* entry, unsigned short mode) {
  return make(directory->mnt, directory->dentry, entry, mode);
}

SEC("lsm/path_mkdir")
int BPF_PROG(make_directory, const struct path* directory, struct dentry* entry) {
  return make(directory->mnt, directory->dentry, entry, S_IFDIR);
}

SEC("lsm/path_symlink")
int BPF_PROG(make_link, const struct path* directory, struct dentry* entry) {
  return make(directory->mnt, directory->dentry, entry, S_IFLNK);
}

// ---- Using files

static __always_inline __u32 wanted_of(struct file* file) {
  __u32 flags = file->f_flags;
  __u32 mode = file->f_mode;
  if (flags & FMODE_EXEC_FLAG) return kUseExecute;
  if (is_directory(file->f_inode)) return mode & FMODE_READ ? kUseList : 0;
  return (mode & FMODE_READ ? kUseRead : 0) | (mode & FMODE_WRITE ? kUseWrite : 0);
}

static __always_inline bool is_written_device(struct file* file) {
  return (file->f_inode->i_mode & S_IFMT) == S_IFBLK && file->f_mode & FMODE_WRITE;
}

// A file that has no name yet: whoever opens it makes it.
static __always_inline int make_nameless(struct Asker* asker, struct file* file) {
  struct dentry* entry = file->f_path.dentry;
  __u32 label = 0;
  int result = judge_making(asker, file->f_path.mnt, entry->d_parent, entry, kMakeRegular, &label);
  if (result || !label) return result;
  if (!has_room()) return -ENOSPC;
  give_label(file->f_inode, label);
  return 0;
}

SEC("lsm/file_open")
int BPF_PROG(open_file, struct file* file) {
  struct Asker asker = {};
  struct dentry* entry = file->f_path.dentry;
  if (!is_asked_to_open(&asker, file) || !is_mounted(entry)) return 0;
  // What lies below all file systems would be changed.
  if (is_written_device(file))
    return refuse_path(asker.domain, asker.level, act(kActReachModule, 0, 0), &file->f_path);
  if (file->f_flags & O_TMPFILE_FLAG) {
    int result = make_nameless(&asker, file);
    if (result) return result;
  }
  return judge_open_file(&asker, file, wanted_of(file));
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

// ---- Removing and moving them

SEC("lsm/path_unlink")
int BPF_PROG(remove_file, const struct path* directory, struct dentry* entry) {
  return may_file(directory->mnt, entry, kUseRemove);
}

SEC("lsm/path_rmdir")
int BPF_PROG(remove_directory, const struct path* directory, struct dentry* entry) {
  return may_file(directory->mnt, entry, kUseRemove);
}

// Whoever gives a file a second place is allowed no more with it there than where it is, nor with
// what is beneath it.
static __always_inline int judge_place(struct Asker* asker, struct vfsmount* mount,
                                       struct dentry* entry, struct dentry* directory,
                                       struct dentry* place) {
  struct inode* inode = entry->d_inode;
  if (!inode) return 0;
  __u32 label = label_of(entry);
  __u32* own = own_label(inode);
  __u32 inherited = label_of_directory(directory);
  __u32 later = own && inherited != kLabelUnknown ? label_in(*own) : inherited;
  __u32 said = said_of(asker, mount, entry);
  __u32 said_later = said_of(asker, mount, place);
  __u32 gained = rights_of(asker, later, said_later) & ~rights_of(asker, label, said);
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
static __always_inline int judge_entry(struct Asker* asker, struct vfsmount* mount,
                                       struct dentry* entry, struct dentry* directory,
                                       struct dentry* place) {
  struct inode* inode = entry->d_inode;
  if (!inode) return 0;
  __u32 ignored = 0;
  int result = judge_making(asker, mount, directory, place, kind_of(inode->i_mode), &ignored);
  return result ? result : judge_place(asker, mount, entry, directory, place);
}

SEC("lsm/path_link")
int BPF_PROG(link_file, struct dentry* entry, const struct path* directory, struct dentry* place) {
  struct Asker asker = {};
  if (!is_asked(&asker)) return 0;
  return judge_entry(&asker, directory->mnt, entry, directory->dentry, place);
}

SEC("lsm/path_rename")
int BPF_PROG(move_file, const struct path* directory, struct dentry* entry,
             const struct path* new_directory, struct dentry* place, unsigned int flags) {
  struct Asker asker = {};
  if (!is_asked(&asker)) return 0;
  struct vfsmount* mount = directory->mnt;
  int result = judge_file(&asker, mount, entry, kUseRemove);
  if (result) return result;
  if (place->d_inode) result = judge_file(&asker, mount, place, kUseRemove);
  if (result) return result;
  result = judge_entry(&asker, mount, entry, new_directory->dentry, place);
  if (result || !(flags & RENAME_EXCHANGE)) return result;
  return judge_entry(&asker, mount, place, directory->dentry, entry);
}

// ---- What would change the names of all

static __always_inline int keep_names(void) {
  struct Asker asker = {};
  if (!is_asked(&asker) || !asker.has_paths) return 0;
  return refuse(asker.domain, asker.level, act(kActReachModule, 0, 0));
}

SEC("lsm/sb_mount")
int BPF_PROG(keep_names_from_mount, const char* device) { return keep_names(); }

SEC("lsm/move_mount")
int BPF_PROG(keep_names_from_move, const struct path* from) { return keep_names(); }

SEC("lsm/sb_pivotroot")
int BPF_PROG(keep_names_from_pivot, const struct path* from) { return keep_names(); }

#endif
