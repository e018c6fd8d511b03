// The file system that programs and maps are kept in.
#ifndef PINS_BPF_H
#define PINS_BPF_H

#include "refusal.bpf.h"

#define BPF_FS_MAGIC 0xcafe4a11

// For those who would remove or rename what is there, or let others come to it.
static __always_inline int protect_pins(struct dentry* entry) {
  return BPF_CORE_READ(entry, d_sb, s_magic) == BPF_FS_MAGIC ? refuse_in_any_domain() : 0;
}

SEC("lsm/path_chmod")
int BPF_PROG(protect_pins_from_mode, const struct path* path, unsigned short mode) {
  return protect_pins(path->dentry);
}

SEC("lsm/path_chown")
int BPF_PROG(protect_pins_from_owner, const struct path* path) {
  return protect_pins(path->dentry);
}

#endif
