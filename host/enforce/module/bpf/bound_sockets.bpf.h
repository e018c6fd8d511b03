// What is known of unix sockets from when they are given a name: by whom, and to a thread which is
// about to make the file of one, of what kind that is.
#ifndef BOUND_SOCKETS_BPF_H
#define BOUND_SOCKETS_BPF_H

#include "refusal.bpf.h"

#define SOCK_STREAM 1
#define SOCK_SEQPACKET 5

// As one of kSocket..., and one more, from when a socket is bound until its file is made.
struct {
  __uint(type, BPF_MAP_TYPE_TASK_STORAGE);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, int);
  __type(value, __u32);
} bindings SEC(".maps");

// The domains that have given them a name; the first one stays.
struct {
  __uint(type, BPF_MAP_TYPE_SK_STORAGE);
  __uint(map_flags, BPF_F_NO_PREALLOC);
  __type(key, int);
  __type(value, __u32);
} namers SEC(".maps");

static __always_inline __u32 kind_of_socket(int type) {
  if (type == SOCK_STREAM) return kSocketStream;
  return type == SOCK_SEQPACKET ? kSocketSeqpacket : kSocketDatagram;
}

static __always_inline bool note_namer(struct sock* sock, __u32 domain) {
  return bpf_sk_storage_get(&namers, sock, &domain, BPF_LOCAL_STORAGE_GET_F_CREATE);
}

static __always_inline bool note_kind(int type) {
  struct task_struct* thread = bpf_get_current_task_btf();
  __u32 noted = kind_of_socket(type) + 1;
  __u32* kept = bpf_task_storage_get(&bindings, thread, &noted, BPF_LOCAL_STORAGE_GET_F_CREATE);
  if (kept) *kept = noted;
  return kept;
}

static __always_inline int note_unix_binding(struct socket* socket, struct sock* sock) {
  __u32 domain = current_domain();
  if (domain == kNoDomain) return 0;
  return note_namer(sock, domain) && note_kind(socket->type) ? 0 : -ENOMEM;
}

// 0 where no socket is bound, as the file of one can be made for itself.
static __always_inline __u32 take_binding(void) {
  __u32* kept = bpf_task_storage_get(&bindings, bpf_get_current_task_btf(), 0, 0);
  __u32 noted = kept ? *kept & 3 : 0;
  if (kept) *kept = 0;
  return noted;
}

#endif
