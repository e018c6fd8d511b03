// Unix sockets: which are given paths, and which are reached.
#ifndef UNIX_SOCKETS_BPF_H
#define UNIX_SOCKETS_BPF_H

#include "bound_sockets.bpf.h"
#include "files.bpf.h"

// One that is to be told who its peers are is given a name by the kernel when it is used.
SEC("lsm/socket_setsockopt")
int BPF_PROG(choose_option, struct socket* socket) {
  struct sock* sock = socket->sk;
  __u32 domain = current_domain();
  if (domain == kNoDomain || !sock || sock->__sk_common.skc_family != AF_UNIX) return 0;
  return note_namer(sock, domain) ? 0 : -ENOMEM;
}

static __always_inline int judge_reaching(struct Asker* asker, __u64 mount, __u64 entry,
                                          __u64 tag) {
  __u32 rules_entry = entry_of(asker->word);
  __u32 said = has_paths(asker->word) ? path_bits_anywhere(mount, entry, rules_entry) : 0;
  __u32 label = label_of(entry);
  __u32 rights = rights_of(rules_entry, label, said);
  remember_rights(tag, rights);
  return rights & kUseWrite ? 0 : refuse_asker(asker, act_on_file(kActUseFile, kUseWrite, label));
}

// By its file, as whoever writes to that. It has the name that whoever bound it knows it by, which
// may be in a mount namespace of its own.
static __always_inline int reach_file(struct vfsmount* mount, struct dentry* entry) {
  struct ModuleHashing* how = how_to_hash();
  __u64 now = current_epoch();
  struct Asker asker = {};
  if (!is_asked(&asker)) return 0;
  __u64 tag = 0;
  if (how && !has_paths(asker.word))
    tag = tag_of_file(entry, entry_of(asker.word), now, how) & ~(__u64)kAllUses;
  if (was_granted(tag, kUseWrite)) return 0;
  return judge_reaching(&asker, number_of(mount), number_of(entry), tag);
}

// By its name alone, which no rule is about: within the domain.
static __always_inline int reach_name(struct sock* other) {
  struct Asker asker = {};
  if (!is_asked(&asker)) return 0;
  __u32* namer = bpf_sk_storage_get(&namers, other, 0, 0);
  if (namer && *namer == asker.domain && level_of(asker.word) != kLevelAbsent) return 0;
  return refuse_asker(&asker, act(kActReachSocket, 0, 0));
}

// What has no name is reached by who was given it.
static __always_inline int reach_socket(struct sock* other) {
  if (current_domain() == kNoDomain) return 0;
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
