// Rules about sockets and identities, by the module: hunts for a way to a port, a user or a group
// that no rule grants.

#include <arpa/inet.h>
#include <grp.h>
#include <linux/mptcp.h>
#include <netinet/in.h>
#include <sys/fsuid.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstring>
#include <random>
#include <string>
#include <vector>

#include "host/enforce/supervise/file_descriptor.h"
#include "policy/decision.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

using Enforce::FileDescriptor;

constexpr int kGranted = 4001;
constexpr int kElsewhere = 4002;

struct Kind {
  const char* name;
  int family;
  int type;
  int protocol = 0;
};
constexpr Kind kTcp = {"TCP", AF_INET, SOCK_STREAM};
constexpr Kind kUdp = {"UDP", AF_INET, SOCK_DGRAM};
constexpr Kind kTcp6 = {"TCP, IPv6", AF_INET6, SOCK_STREAM};
constexpr Kind kUdp6 = {"UDP, IPv6", AF_INET6, SOCK_DGRAM};
constexpr Kind kMptcp = {"MPTCP", AF_INET, SOCK_STREAM, IPPROTO_MPTCP};
constexpr Kind kKinds[] = {kTcp, kUdp, kTcp6, kUdp6, kMptcp};

struct Address {
  sockaddr_storage bytes = {};
  socklen_t size = 0;

  const sockaddr* Get() const { return reinterpret_cast<const sockaddr*>(&bytes); }
};

// Of this machine itself.
Address LocalAddress(int family, int port) {
  Address address;
  if (family == AF_INET) {
    sockaddr_in four = {};
    four.sin_family = AF_INET;
    four.sin_port = htons(static_cast<std::uint16_t>(port));
    four.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.bytes = {};
    memcpy(&address.bytes, &four, sizeof(four));
    address.size = sizeof(four);
    return address;
  }
  sockaddr_in6 six = {};
  six.sin6_family = AF_INET6;
  six.sin6_port = htons(static_cast<std::uint16_t>(port));
  six.sin6_addr = in6addr_loopback;
  memcpy(&address.bytes, &six, sizeof(six));
  address.size = sizeof(six);
  return address;
}

Address MappedAddress(int port) {
  Address address = LocalAddress(AF_INET6, port);
  auto& six = reinterpret_cast<sockaddr_in6&>(address.bytes);
  EXPECT_EQ(inet_pton(AF_INET6, "::ffff:127.0.0.1", &six.sin6_addr), 1);
  return address;
}

// Without a family, at any address of this machine.
Address AddressOfNoFamily(int port) {
  Address address = LocalAddress(AF_INET, port);
  auto& four = reinterpret_cast<sockaddr_in&>(address.bytes);
  four.sin_family = AF_UNSPEC;
  four.sin_addr.s_addr = htonl(INADDR_ANY);
  return address;
}

FileDescriptor Open(const Kind& kind) {
  return FileDescriptor(socket(kind.family, kind.type | SOCK_CLOEXEC, kind.protocol));
}

int Bind(const Kind& kind, const Address& address) {
  const FileDescriptor made = Open(kind);
  return ErrorOf(bind(made.Number(), address.Get(), address.size));
}

// Nobody listens at the ports, so what is not refused by the module is refused by those.
int Connect(const Kind& kind, const Address& address) {
  const FileDescriptor made = Open(kind);
  const int error = ErrorOf(connect(made.Number(), address.Get(), address.size));
  return error == ECONNREFUSED ? 0 : error;
}

int Send(const Kind& kind, const Address& address, int flags = 0) {
  const FileDescriptor made = Open(kind);
  const int error =
      ErrorOf(sendto(made.Number(), "x", 1, flags | MSG_NOSIGNAL, address.Get(), address.size));
  return error == ECONNREFUSED ? 0 : error;
}

int SendMany(const Kind& kind, const Address& address) {
  const FileDescriptor made = Open(kind);
  char text[] = "x";
  iovec part = {text, 1};
  mmsghdr message = {};
  message.msg_hdr.msg_name = const_cast<sockaddr*>(address.Get());
  message.msg_hdr.msg_namelen = address.size;
  message.msg_hdr.msg_iov = &part;
  message.msg_hdr.msg_iovlen = 1;
  return ErrorOf(sendmmsg(made.Number(), &message, 1, 0));
}

int Listen(const Kind& kind) {
  const FileDescriptor made = Open(kind);
  return ErrorOf(listen(made.Number(), 1));
}

int MakeSocket(const Kind& kind) { return Open(kind).IsOpen() ? 0 : errno; }

class ModuleSocketTest : public ModuleTest {
 protected:
  void Publish(const std::vector<std::string>& rules) {
    module->Publish(PlanModule({Numbered(rules)}, CAP_LAST_CAP), 2);
  }

  // The first is allowed in the domain, and the second refused there alone.
  void ExpectTold(const Act& granted, const Act& refused, const std::string& what) {
    SCOPED_TRACE(what);
    EXPECT_EQ(In(kDomain, granted), 0);
    ExpectRefused(refused);
  }
};

TEST_F(ModuleSocketTest, BindsToGrantedPortsAlone) {
  Publish({"-p bind_port 4001 grant"});
  for (const Kind& kind : kKinds) {
    ExpectTold([&] { return Bind(kind, LocalAddress(kind.family, kGranted)); },
               [&] { return Bind(kind, LocalAddress(kind.family, kElsewhere)); }, kind.name);
    ExpectRefused([&] { return Bind(kind, LocalAddress(kind.family, 0)); });
  }
  ExpectTold([] { return Bind(kTcp6, MappedAddress(kGranted)); },
             [] { return Bind(kTcp6, MappedAddress(kElsewhere)); }, "mapped");
  ExpectTold([] { return Bind(kTcp, AddressOfNoFamily(kGranted)); },
             [] { return Bind(kTcp, AddressOfNoFamily(kElsewhere)); }, "no family");
}

TEST_F(ModuleSocketTest, ListensWithoutAPortWhereTheKernelMayChooseOne) {
  Publish({"-p bind_port 4001 grant"});
  for (const Kind& kind : {kTcp, kTcp6, kMptcp}) ExpectRefused([&] { return Listen(kind); });
  const auto listenAtPort = [] {
    const FileDescriptor made = Open(kTcp);
    const Address address = LocalAddress(AF_INET, kGranted);
    if (bind(made.Number(), address.Get(), address.size) != 0) return errno;
    return ErrorOf(listen(made.Number(), 1));
  };
  EXPECT_EQ(In(kDomain, listenAtPort), 0);
  Publish({"-p bind_port 0 grant"});
  for (const Kind& kind : {kTcp, kTcp6, kMptcp}) {
    EXPECT_EQ(In(kDomain, [&] { return Listen(kind); }), 0);
    EXPECT_EQ(In(kDomain, [&] { return Bind(kind, LocalAddress(kind.family, 0)); }), 0);
  }
}

TEST_F(ModuleSocketTest, ConnectsToGrantedPortsAlone) {
  Publish({"-p connect_port 4001 grant"});
  for (const Kind& kind : kKinds) {
    ExpectTold([&] { return Connect(kind, LocalAddress(kind.family, kGranted)); },
               [&] { return Connect(kind, LocalAddress(kind.family, kElsewhere)); }, kind.name);
  }
  ExpectTold([] { return Connect(kTcp6, MappedAddress(kGranted)); },
             [] { return Connect(kTcp6, MappedAddress(kElsewhere)); }, "mapped");
  EXPECT_EQ(In(kDomain, [] { return Connect(kUdp, AddressOfNoFamily(kElsewhere)); }), 0);
}

TEST_F(ModuleSocketTest, ReachesPortsThatAreNotRevoked) {
  Publish({"-p connect_port 4002 revoke"});
  ExpectTold([] { return Connect(kTcp, LocalAddress(AF_INET, kGranted)); },
             [] { return Connect(kTcp, LocalAddress(AF_INET, kElsewhere)); }, "revoked");
}

TEST_F(ModuleSocketTest, SendsToGrantedPortsAlone) {
  Publish({"-p connect_port 4001 grant"});
  for (const Kind& kind : {kUdp, kUdp6}) {
    ExpectTold([&] { return Send(kind, LocalAddress(kind.family, kGranted)); },
               [&] { return Send(kind, LocalAddress(kind.family, kElsewhere)); }, kind.name);
    ExpectTold([&] { return SendMany(kind, LocalAddress(kind.family, kGranted)); },
               [&] { return SendMany(kind, LocalAddress(kind.family, kElsewhere)); }, kind.name);
  }
  // To 0.0.0.0 is to this machine itself.
  ExpectTold([] { return Send(kUdp, AddressOfNoFamily(kGranted)); },
             [] { return Send(kUdp, AddressOfNoFamily(kElsewhere)); }, "no family");
  ExpectTold([] { return Send(kUdp6, MappedAddress(kGranted)); },
             [] { return Send(kUdp6, MappedAddress(kElsewhere)); }, "mapped");
}

TEST_F(ModuleSocketTest, SendsWhileItConnectsToGrantedPortsAlone) {
  Publish({"-p connect_port 4001 grant"});
  const auto send = [](const Kind& kind, int port) {
    const int error = Send(kind, LocalAddress(kind.family, port), MSG_FASTOPEN);
    return error == EINPROGRESS ? 0 : error;
  };
  for (const Kind& kind : {kTcp, kTcp6}) {
    ExpectTold([&] { return send(kind, kGranted); }, [&] { return send(kind, kElsewhere); },
               kind.name);
  }
  // Older kernels do not know it of MPTCP.
  EXPECT_EQ(In(kDomain, [&] { return send(kMptcp, kElsewhere); }), EPERM);
  EXPECT_NE(In(kDomain, [&] { return send(kMptcp, kGranted); }), EPERM);
}

TEST_F(ModuleSocketTest, MakesNoSocketThatGoesPastPorts) {
  constexpr Kind kPastPorts[] = {{"raw", AF_INET, SOCK_RAW, IPPROTO_TCP},
                                 {"raw, IPv6", AF_INET6, SOCK_RAW, IPPROTO_UDP},
                                 {"packets", AF_PACKET, SOCK_RAW},
                                 {"XDP", AF_XDP, SOCK_RAW}};
  for (const char* const rule : {"-p bind_port 4001 grant", "-p connect_port 25 revoke"}) {
    Publish({rule, "-c cap_net_raw grant"});
    for (const Kind& kind : kPastPorts) {
      SCOPED_TRACE(kind.name);
      ExpectRefused([&] { return MakeSocket(kind); });
    }
    EXPECT_EQ(In(kDomain, [] { return MakeSocket(kUdp6); }), 0);
  }
  Publish({"-c cap_net_raw grant"});
  for (const Kind& kind : kPastPorts)
    EXPECT_EQ(In(kDomain, [&] { return MakeSocket(kind); }), 0) << kind.name;
}

TEST_F(ModuleSocketTest, ChecksFamiliesByTheKernelsNumbers) {
  Publish({"-p socket_family 2 grant", "-p socket_type 1 grant"});
  const auto make = [](unsigned long family, unsigned long type) {
    return ErrorOf(syscall(SYS_socket, family, type, 0));
  };
  constexpr unsigned long kHighBit = 1UL << 32;
  ExpectTold([&] { return make(AF_INET | kHighBit, SOCK_STREAM | kHighBit); },
             [&] { return make(AF_INET6 | kHighBit, SOCK_STREAM); }, "high bits");
  ExpectTold([&] { return make(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK); },
             [&] { return make(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC); }, "flags");
}

// ---- Identities

constexpr unsigned int kSomebody = 1001;
constexpr unsigned int kOtherOne = 1002;
// What stays as it is.
constexpr unsigned int kKept = static_cast<unsigned int>(-1);

int BecomeFileUser(uid_t user) {
  setfsuid(user);
  return setfsuid(kKept) == static_cast<int>(user) ? 0 : EPERM;
}

int BecomeFileGroup(gid_t group) {
  setfsgid(group);
  return setfsgid(kKept) == static_cast<int>(group) ? 0 : EPERM;
}

TEST_F(ModuleSocketTest, BecomesGrantedUsersAlone) {
  using Become = int (*)(uid_t);
  const std::vector<std::pair<const char*, Become>> ways = {
      {"setuid", [](uid_t user) { return ErrorOf(setuid(user)); }},
      {"setreuid, real", [](uid_t user) { return ErrorOf(setreuid(user, kKept)); }},
      {"setreuid, effective", [](uid_t user) { return ErrorOf(setreuid(kKept, user)); }},
      {"setresuid, saved", [](uid_t user) { return ErrorOf(setresuid(kKept, kKept, user)); }},
      {"setresuid", [](uid_t user) { return ErrorOf(setresuid(kKept, user, kKept)); }},
      {"setfsuid", BecomeFileUser}};
  Publish({"-p set_uid 1001 grant", "-c cap_setuid grant"});
  for (const auto& [name, become] : ways)
    ExpectTold([become = become] { return become(kSomebody); },
               [become = become] { return become(kOtherOne); }, name);
  // What a process is already it does not become.
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(setuid(0)); }), 0);
}

TEST_F(ModuleSocketTest, BecomesGrantedGroupsAlone) {
  using Become = int (*)(gid_t);
  const std::vector<std::pair<const char*, Become>> ways = {
      {"setgid", [](gid_t group) { return ErrorOf(setgid(group)); }},
      {"setregid, real", [](gid_t group) { return ErrorOf(setregid(group, kKept)); }},
      {"setresgid, saved", [](gid_t group) { return ErrorOf(setresgid(kKept, kKept, group)); }},
      {"setfsgid", BecomeFileGroup}};
  Publish({"-p set_gid 1001 grant", "-c cap_setgid grant"});
  for (const auto& [name, become] : ways)
    ExpectTold([become = become] { return become(kSomebody); },
               [become = become] { return become(kOtherOne); }, name);
}

TEST_F(ModuleSocketTest, JoinsGrantedGroupsAlone) {
  const auto join = [](std::vector<gid_t> groups) {
    return ErrorOf(setgroups(groups.size(), groups.data()));
  };
  Publish({"-p set_gid 1001 1400 grant", "-p set_gid 1002 revoke", "-c cap_setgid grant"});
  ExpectTold(
      [&] {
        return join({kSomebody, 1003});
      },
      [&] {
        return join({kSomebody, kOtherOne});
      },
      "setgroups");
  std::vector<gid_t> many(300, kSomebody);
  EXPECT_EQ(In(kDomain, [&] { return join(many); }), 0);
  many.back() = kOtherOne;
  ExpectRefused([&] { return join(many); });
  EXPECT_EQ(In(kDomain, [&] { return join({}); }), 0);
}

// ---- What the decision says, held against the kernel

struct CheckedAct {
  const char* check;
  int (*pass)(int value);
};

constexpr CheckedAct kCheckedActs[] = {
    {"bind_port", [](int port) { return Bind(kTcp6, LocalAddress(AF_INET6, port)); }},
    {"connect_port", [](int port) { return Send(kUdp, LocalAddress(AF_INET, port)); }},
    {"set_uid",
     [](int user) { return ErrorOf(setresuid(kKept, kKept, static_cast<uid_t>(user))); }},
    {"set_gid",
     [](int group) {
       const gid_t one = static_cast<gid_t>(group);
       return ErrorOf(setgroups(1, &one));
     }},
};
constexpr int kFirstValue = 4001;
constexpr int kValues = 5;

std::vector<std::string> SomeRules(std::mt19937& chance) {
  std::vector<std::string> rules = {"-c cap_setuid grant", "-c cap_setgid grant"};
  const auto some = [&chance](unsigned int number) { return static_cast<int>(chance() % number); };
  for (int count = some(9); count > 0; --count) {
    const int first = kFirstValue + some(kValues);
    rules.push_back(std::string("-p ") + kCheckedActs[chance() % std::size(kCheckedActs)].check +
                    " " + std::to_string(first) + " " + std::to_string(first + some(3)) +
                    (some(3) == 0 ? " revoke" : " grant"));
  }
  return rules;
}

TEST_F(ModuleSocketTest, RefusesWhatTheDecisionRefuses) {
  int allowed = 0;
  int refused = 0;
  for (unsigned int seed = 0; seed < 25; ++seed) {
    std::mt19937 chance(seed);
    const Policy::InstalledDomain domain = Numbered(SomeRules(chance));
    module->Publish(PlanModule({domain}, CAP_LAST_CAP), 2);
    for (const auto& [check, pass] : kCheckedActs) {
      int value = kFirstValue;
      const Worker worker([&value, pass = pass] { return pass(value++); });
      module->Place(worker.Process(), kDomain);
      for (int asked = value; asked < kFirstValue + kValues; ++asked) {
        const Policy::ParameterQuestion question{check, std::to_string(asked)};
        const bool isAllowed = Decide(question, domain).IsAllowed();
        EXPECT_EQ(worker.Do(), isAllowed ? 0 : EPERM) << seed << ": " << check << " " << asked;
        ++(isAllowed ? allowed : refused);
      }
    }
  }
  EXPECT_GT(allowed, 100);
  EXPECT_GT(refused, 100);
}

}  // namespace
}  // namespace EnforceTest
