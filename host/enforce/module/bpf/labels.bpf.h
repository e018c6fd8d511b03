// Which label a file has: its own, else that of the nearest directory above it that has one, within
// its file system.
#ifndef LABELS_BPF_H
#define LABELS_BPF_H

#include "refusal.bpf.h"

#define CAP_SYS_ADMIN 21
// Of a file system that nobody can mount: of pipes, sockets, files in memory.
#define SB_NOUSER (1UL << 31)
#define S_IFMT 0170000
#define S_IFDIR 0040000

// No directory lies deeper, or its label cannot be told.
#define MOST_DIRECTORIES 64

// The labels that files carry themselves. Older kernels let no program read the attribute, so they
// are learned when somebody else reads or writes it.
struct {
  __uint(type, BPF_MAP_TYPE_HASH);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, struct ModuleFile);
  __type(value, __u32);
  __uint(max_entries, kMostLabelledFiles);
} labels SEC(".maps");

// The file systems of which all labels were learned.
struct {
  __uint(type, BPF_MAP_TYPE_HASH);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, __u32);
  __type(value, __u32);
  __uint(max_entries, kMostFileSystems);
} devices SEC(".maps");

// Not in the storage of inodes: newer kernels let no program come there by the path of a file.
struct {
  __uint(type, BPF_MAP_TYPE_LRU_HASH);
  __type(key, struct ModuleFile);
  __type(value, __u64);
  __uint(max_entries, kMostKnownDirectories);
} directories SEC(".maps");

struct {
  __uint(type, BPF_MAP_TYPE_ARRAY);
  __uint(map_flags, BPF_F_MMAPABLE);
  __type(key, __u32);
  __type(value, struct ModuleHashing);
  __uint(max_entries, 1);
} hashing SEC(".maps");

static __always_inline struct ModuleHashing* how_to_hash(void) {
  __u32 only = 0;
  return bpf_map_lookup_elem(&hashing, &only);
}

static __always_inline __u64 epoch_of(struct ModuleHashing* how) {
  return *(volatile __u64*)&how->epoch;
}

static __always_inline __u64 current_epoch(void) {
  struct ModuleHashing* how = how_to_hash();
  return how ? epoch_of(how) : 0;
}

static __always_inline void begin_epoch(void) {
  struct ModuleHashing* how = how_to_hash();
  if (how) __sync_fetch_and_add(&how->epoch, 1);
}

// For functions that take no pointers.
static __always_inline __u64 number_of(const void* pointer) {
  __u64 number = 0;
  bpf_probe_read_kernel(&number, sizeof(number), &pointer);
  return number;
}

static __always_inline bool is_directory(struct inode* inode) {
  return (BPF_CORE_READ(inode, i_mode) & S_IFMT) == S_IFDIR;
}

// What follows reads the kernel by its addresses, not by typed pointers: newer verifiers search all
// types of the kernel for each pointer that is followed.
static __always_inline struct ModuleFile key_of(struct inode* inode) {
  struct ModuleFile key = {BPF_CORE_READ(inode, i_ino), BPF_CORE_READ(inode, i_sb, s_dev),
                           BPF_CORE_READ(inode, i_generation)};
  return key;
}

static __always_inline __u32 label_in(__u32 carried) { return carried & ~kLabelIsUnwritten; }

// The label that the file itself carries; null where it carries none.
static __always_inline __u32* own_label(struct inode* inode) {
  struct ModuleFile key = key_of(inode);
  return bpf_map_lookup_elem(&labels, &key);
}

// The way from a directory up to one that carries a label.
struct LabelSearch {
  struct dentry* directory;
  __u32 device;
  __u32 label;
};

enum { kGoOn, kEnd };

static long look_at_directory(__u32 depth, struct LabelSearch* search) {
  struct dentry* directory = search->directory;
  struct inode* inode = BPF_CORE_READ(directory, d_inode);
  struct ModuleFile key = {BPF_CORE_READ(inode, i_ino), search->device,
                           BPF_CORE_READ(inode, i_generation)};
  __u32* own = bpf_map_lookup_elem(&labels, &key);
  if (own) {
    search->label = label_in(*own);
    return kEnd;
  }
  search->directory = BPF_CORE_READ(directory, d_parent);
  if (search->directory != directory) return kGoOn;
  // What was opened by its handle may not be reached from the root.
  if (directory == BPF_CORE_READ(directory, d_sb, s_root)) search->label = kLabelNone;
  return kEnd;
}

// Takes the address as a number: such functions are verified once for all that call them.
__noinline __u32 find_label(__u64 directory) {
  struct dentry* first = (struct dentry*)directory;
  struct LabelSearch search = {first, 0, kLabelUnknown};
  struct super_block* system = BPF_CORE_READ(first, d_sb);
  search.device = BPF_CORE_READ(system, s_dev);
  if (!bpf_map_lookup_elem(&devices, &search.device)) return kLabelUnknown;
  bpf_loop(MOST_DIRECTORIES, look_at_directory, &search, 0);
  return search.label;
}

__noinline __u32 label_of_directory(__u64 number) {
  struct dentry* directory = (struct dentry*)number;
  struct inode* inode = BPF_CORE_READ(directory, d_inode);
  if (!inode) return kLabelUnknown;
  // Read first: what changes while the label is looked for begins another one.
  __u64 now = current_epoch();
  struct ModuleFile key = key_of(inode);
  __u64* known = bpf_map_lookup_elem(&directories, &key);
  if (known && *(volatile __u64*)known >> kEpochShift == now)
    return *(volatile __u64*)known & ((1 << kEpochShift) - 1);
  __u32 label = find_label(number);
  if (label >> kEpochShift) return label;
  __u64 found = now << kEpochShift | label;
  bpf_map_update_elem(&directories, &key, &found, BPF_ANY);
  return label;
}

// Of a file that is there. kLabelUnknown where it cannot be told. Stands in for the one of
// shared.bpf.h.
__weak __noinline __u32 label_of(__u64 entry) { return kLabelUnknown; }

static __always_inline __u32 find_label_of(__u64 number) {
  struct dentry* entry = (struct dentry*)number;
  struct inode* inode = BPF_CORE_READ(entry, d_inode);
  if (!inode) return kLabelUnknown;
  if (is_directory(inode)) return label_of_directory(number);
  struct dentry* directory = BPF_CORE_READ(entry, d_parent);
  // As that of its directory, were it one.
  if (directory == entry) return kLabelUnknown;
  __u32 inherited = label_of_directory((__u64)directory);
  if (inherited == kLabelUnknown) return kLabelUnknown;
  __u32* own = own_label(inode);
  return own ? label_in(*own) : inherited;
}

// ---- What files carry

static __always_inline bool is_label(const char* name) {
  const char label[24] = "security.bpf.zorvan";
  char given[24] = {};
  bpf_probe_read_kernel_str(given, sizeof(given), name);
  const __u64* expected = (const __u64*)label;
  const __u64* words = (const __u64*)given;
  return words[0] == expected[0] && words[1] == expected[1] && words[2] == expected[2];
}

// Which argument of a hook points to the value of an attribute. Older kernels let no program read
// such an argument as what it is.
static __always_inline __u32 value_at(void* argument) {
  const void* value = 0;
  __u32 label = kLabelUnknown;
  bpf_probe_read_kernel(&value, sizeof(value), argument);
  bpf_probe_read_kernel(&label, sizeof(label), value);
  return label;
}

// Not all kernels ask for the capability themselves where such programs run.
static __always_inline bool may_label(void) {
  const struct cred* credentials = bpf_get_current_task_btf()->cred;
  __u32 capabilities = 0;
  bpf_probe_read_kernel(&capabilities, sizeof(capabilities), &credentials->cap_effective);
  return capabilities >> CAP_SYS_ADMIN & 1 && credentials->user_ns->level == 0;
}

static __always_inline int protect_label(void) {
  return may_label() ? refuse_in_any_domain() : -EPERM;
}

// From here until it is labelled nobody can tell which label the file has; and there is room for
// it.
SEC("lsm/inode_setxattr")
int BPF_PROG(begin_label, void* space, struct dentry* entry, const char* name) {
  struct inode* inode = entry->d_inode;
  if (!inode || !is_label(name)) return 0;
  int result = protect_label();
  if (result || own_label(inode)) return result;
  struct ModuleFile key = key_of(inode);
  __u32 unknown = kLabelUnknown;
  if (bpf_map_update_elem(&labels, &key, &unknown, BPF_ANY)) return -ENOSPC;
  begin_epoch();
  return 0;
}

SEC("lsm/inode_post_setxattr")
int BPF_PROG(change_label, struct dentry* entry, const char* name, const void* value,
             unsigned long size) {
  struct inode* inode = entry->d_inode;
  if (!inode || !is_label(name)) return 0;
  __u32 label = size == sizeof(label) ? value_at(&ctx[2]) : kLabelUnknown;
  __u32* own = own_label(inode);
  if (own) {
    *(volatile __u32*)own = label;
  } else {
    struct ModuleFile key = key_of(inode);
    bpf_map_update_elem(&labels, &key, &label, BPF_ANY);
  }
  begin_epoch();
  return 0;
}

static __always_inline void forget_unknown(struct inode* inode) {
  __u32* own = own_label(inode);
  if (!own || *own != kLabelUnknown) return;
  struct ModuleFile key = key_of(inode);
  bpf_map_delete_elem(&labels, &key);
  begin_epoch();
}

SEC("lsm/inode_removexattr")
int BPF_PROG(begin_unlabel, void* space, struct dentry* entry, const char* name) {
  struct inode* inode = entry->d_inode;
  if (!inode || !is_label(name)) return 0;
  int result = protect_label();
  if (result) return result;
  __u32* own = own_label(inode);
  if (!own) return 0;
  *(volatile __u32*)own = kLabelUnknown;
  begin_epoch();
  return 0;
}

SEC("fexit/vfs_removexattr")
int BPF_PROG(end_unlabel, void* space, struct dentry* entry, const char* name, int result) {
  struct inode* inode = entry->d_inode;
  if (inode && result == 0 && is_label(name)) forget_unknown(inode);
  return 0;
}

// What is read is learned, unless it is known better; and that there is nothing. Nobody else can
// be told to read just when a label changes.
SEC("fexit/vfs_getxattr")
int BPF_PROG(learn_label, void* space, struct dentry* entry, const char* name, void* value,
             unsigned long size, long result) {
  struct inode* inode = entry->d_inode;
  if (!inode || !is_label(name) || !may_label() || current_task()) return 0;
  if (result == -ENODATA) forget_unknown(inode);
  bool is_carried = result > 0 || result == -ERANGE;
  if (!is_carried || !size) return 0;
  __u32 label = result == sizeof(label) ? value_at(&ctx[3]) : kLabelUnknown;
  __u32* own = own_label(inode);
  if (own) {
    if (*own != kLabelUnknown) return 0;
    *(volatile __u32*)own = label;
  } else {
    struct ModuleFile key = key_of(inode);
    bpf_map_update_elem(&labels, &key, &label, BPF_NOEXIST);
  }
  begin_epoch();
  return 0;
}

// ---- What becomes of them

SEC("fexit/vfs_rename")
int BPF_PROG(move_directory, struct renamedata* move, int result) {
  struct inode* moved = move->old_dentry->d_inode;
  struct inode* other = move->new_dentry->d_inode;
  if (result) return 0;
  if ((moved && is_directory(moved)) || (other && is_directory(other))) begin_epoch();
  return 0;
}

SEC("lsm/inode_free_security")
int BPF_PROG(forget_file, struct inode* inode) {
  if (inode->i_nlink) return 0;
  struct ModuleFile key = key_of(inode);
  bpf_map_delete_elem(&labels, &key);
  return 0;
}

// Another one may have its number next.
SEC("lsm/sb_free_security")
int BPF_PROG(forget_file_system, struct super_block* system) {
  __u32 device = system->s_dev;
  bpf_map_delete_elem(&devices, &device);
  begin_epoch();
  return 0;
}

#endif
