// Unix sockets: which are given paths, and which are reached.
#ifndef UNIX_SOCKETS_BPF_H
#define UNIX_SOCKETS_BPF_H

#include "bound_sockets.bpf.h"
#include "files.bpf.h"

#define AF_UNIX 1

// In which domain they were made.
struct {
  __uint(type, BPF_MAP_TYPE_SK_STORAGE);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, int);
  __type(value, __u32);
} socket_domains SEC(".maps");

SEC("lsm/socket_post_create")
int BPF_PROG(keep_domain_of_socket, struct socket* socket, int family, int type, int protocol,
             int is_of_kernel) {
  if (family != AF_UNIX || is_of_kernel) return 0;
  struct ModuleTask* task = current_task();
  struct sock* sock = socket->sk;
  if (!task || !sock) return 0;
  __u32 domain = task->domain;
  bool is_kept = bpf_sk_storage_get(&socket_domains, sock, &domain, BPF_LOCAL_STORAGE_GET_F_CREATE);
  return is_kept ? 0 : -ENOMEM;
}

SEC("lsm/socket_bind")
int BPF_PROG(bind_unix_socket, struct socket* socket) {
  struct sock* sock = socket->sk;
  if (!sock || sock->__sk_common.skc_family != AF_UNIX || !current_task()) return 0;
  return note_binding(socket->type) ? 0 : -ENOMEM;
}

// By its file, as whoever writes to that. It has the name that whoever bound it knows it by, which
// may be in a mount namespace of its own.
static __noinline int reach_file(struct vfsmount* mount, struct dentry* entry) {
  struct Asker asker = {};
  if (!is_asked(&asker)) return 0;
  __u32 said = 0;
  if (asker.has_paths) said = path_bits_anywhere(mount, entry, asker.entry);
  __u32 label = label_of(entry);
  if (rights_of(&asker, label, said) & kUseWrite) return 0;
  return refuse(asker.domain, asker.level, act_on_file(kActUseFile, kUseWrite, label));
}

// By its name alone, which no rule is about: within the domain.
static __always_inline int reach_name(struct sock* other) {
  struct ModuleTask* task = current_task();
  if (!task) return 0;
  __u64 word = word_of(task->domain);
  __u32* domain = bpf_sk_storage_get(&socket_domains, other, 0, 0);
  if (domain && *domain == task->domain && level_of(word) != kLevelAbsent) return 0;
  return refuse(task->domain, level_of(word), act(kActReachSocket, 0, 0));
}

// What has no name is reached by who was given it.
static __always_inline int reach_socket(struct sock* other) {
  if (!current_task()) return 0;
  struct unix_sock* socket = bpf_skc_to_unix_sock(other);
  if (!socket || !socket->addr) return 0;
  struct dentry* entry = socket->path.dentry;
  return entry ? reach_file(socket->path.mnt, entry) : reach_name(other);
}

SEC("lsm/unix_stream_connect")
int BPF_PROG(connect_unix_socket, struct sock* socket, struct sock* other) {
  return reach_socket(other);
}

SEC("lsm/unix_may_send")
int BPF_PROG(send_to_unix_socket, struct socket* socket, struct socket* other) {
  struct sock* sock = other->sk;
  return sock ? reach_socket(sock) : 0;
}

#endif
