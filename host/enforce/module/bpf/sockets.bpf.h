// Rules about what sockets are made and which ports they use.
#ifndef SOCKETS_BPF_H
#define SOCKETS_BPF_H

#include <bpf/bpf_endian.h>

#include "bound_sockets.bpf.h"
#include "checks.bpf.h"

// Families of sockets whose addresses have a port, at the same place in all of them.
#define AF_INET 2
#define AF_INET6 10
#define AF_SMC 43

// Families that carry packets of the internet by other addresses, and the first that was not
// looked at for that.
#define AF_PACKET 17
#define AF_RDS 21
#define AF_PPPOX 24
#define AF_TIPC 30
#define AF_RXRPC 33
#define AF_KCM 41
#define AF_XDP 44
#define FIRST_NEWER_FAMILY 46

#define AF_UNSPEC 0
#define AF_UNIX 1
#define SOCK_RAW 3
#define SOCK_SEQPACKET 5
#define IPPROTO_SCTP 132

#define LAST_PORT 65535

static __always_inline bool has_ports(struct sock* sock) {
  if (!sock) return false;
  int family = sock->__sk_common.skc_family;
  return family == AF_INET || family == AF_INET6 || family == AF_SMC;
}

// Whether such a socket reaches ports in another way than by their numbers in addresses: of SCTP
// has several of them, and others write whole packets.
static __always_inline bool goes_past_ports(int family, int type, int protocol) {
  switch (family) {
    case AF_INET:
    case AF_INET6:
      return type == SOCK_RAW || type == SOCK_SEQPACKET || protocol == IPPROTO_SCTP;
    case AF_PACKET:
    case AF_RDS:
    case AF_PPPOX:
    case AF_TIPC:
    case AF_RXRPC:
    case AF_KCM:
    case AF_XDP:
      return true;
    default:
      return family >= FIRST_NEWER_FAMILY;
  }
}

static __always_inline bool is_open_to_ports(struct ModuleCheck* check) {
  return check->count == 1 && check->ranges[0].first == 0 && check->ranges[0].last >= LAST_PORT;
}

static __always_inline int protect_ports(struct Asker* asker, struct ModuleRules* granted,
                                         int family, int type) {
  if (granted && is_open_to_ports(&granted->checks[kCheckBindPort]) &&
      is_open_to_ports(&granted->checks[kCheckConnectPort]))
    return 0;
  return refuse_asker(asker, act(kActPassPorts, type, family));
}

// What addresses with a port begin with.
struct PortAddress {
  __u16 family;
  __be16 port;
};

// False where there is none.
static __always_inline bool read_port(struct PortAddress* read, const void* address, int length) {
  return length >= (int)sizeof(*read) && !bpf_probe_read_kernel(read, sizeof(*read), address);
}

static __always_inline int check_port(int check, const void* address, int length) {
  struct PortAddress read = {};
  if (current_domain() == kNoDomain || !read_port(&read, address, length)) return 0;
  return check_value(check, bpf_ntohs(read.port));
}

SEC("lsm/socket_create")
int BPF_PROG(make_socket, int family, int type, int protocol, int is_of_kernel) {
  struct ModuleTask* task = current_task();
  if (!task || is_of_kernel) return 0;
  struct Asker asker = {};
  ask_for(&asker, task->domain);
  struct ModuleRules* granted = rules_of(asker.word);
  int result = judge_call(&asker, granted);
  if (!result) result = judge_value(&asker, granted, kCheckFamily, family);
  if (!result) result = judge_value(&asker, granted, kCheckType, type);
  if (result || !goes_past_ports(family, type, protocol)) return result;
  return protect_ports(&asker, granted, family, type);
}

// The family of the address does not count: the kernel takes some without one.
SEC("lsm/socket_bind")
int BPF_PROG(bind_socket, struct socket* socket, struct sockaddr* address, int length) {
  struct sock* sock = socket->sk;
  if (sock && sock->__sk_common.skc_family == AF_UNIX) return note_unix_binding(socket, sock);
  return has_ports(sock) ? check_port(kCheckBindPort, address, length) : 0;
}

// To connect to an address without a family ends a connection.
SEC("lsm/socket_connect")
int BPF_PROG(connect_socket, struct socket* socket, struct sockaddr* address, int length) {
  struct PortAddress read = {};
  struct ModuleTask* task = current_task();
  if (!task || !has_ports(socket->sk) || !read_port(&read, address, length)) return 0;
  if (read.family == AF_UNSPEC) return 0;
  return check_value_in(task->domain, kCheckConnectPort, bpf_ntohs(read.port));
}

// Datagrams, and what TCP sends while it connects.
SEC("lsm/socket_sendmsg")
int BPF_PROG(send_by_socket, struct socket* socket, struct msghdr* message, int size) {
  void* address = message->msg_name;
  if (!address || !has_ports(socket->sk)) return 0;
  return check_port(kCheckConnectPort, address, message->msg_namelen);
}

// What was not bound is given a port by the kernel, as if it were bound to 0.
SEC("lsm/socket_listen")
int BPF_PROG(listen_by_socket, struct socket* socket, int backlog) {
  struct sock* sock = socket->sk;
  if (!has_ports(sock) || sock->__sk_common.skc_num) return 0;
  return check_value(kCheckBindPort, 0);
}

#endif
