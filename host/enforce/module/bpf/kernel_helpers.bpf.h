// Files that say which programs the kernel executes by itself, in no domain.
#ifndef KERNEL_HELPERS_BPF_H
#define KERNEL_HELPERS_BPF_H

#include "refusal.bpf.h"

#define PROC_SUPER_MAGIC 0x9fa0
#define CGROUP_SUPER_MAGIC 0x27e0eb

#define LONGEST_NAME 24

__noinline int names_helper(__u64 file, __u64 system) {
  char name[LONGEST_NAME] = {};
  if (system != PROC_SUPER_MAGIC && system != CGROUP_SUPER_MAGIC) return false;
  const unsigned char* given = BPF_CORE_READ((struct file*)file, f_path.dentry, d_name.name);
  bpf_probe_read_kernel_str(name, sizeof(name), given);
  if (system == CGROUP_SUPER_MAGIC) return !bpf_strncmp(name, sizeof(name), "release_agent");
  return !bpf_strncmp(name, sizeof(name), "core_pattern") ||
         !bpf_strncmp(name, sizeof(name), "modprobe") ||
         !bpf_strncmp(name, sizeof(name), "poweroff_cmd") ||
         !bpf_strncmp(name, sizeof(name), "hotplug");
}

#endif
