// Plans of system calls: hunts for a call or an argument that passes and should not, and for a rule
// that is less than it says without a word.

#include "host/enforce/plan/call_plan.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/fs.h>
#include <linux/prctl.h>
#include <linux/sched.h>
#include <linux/sockios.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/ioctl.h>
#include <sys/resource.h>
#include <sys/socket.h>

#include <csignal>
#include <initializer_list>

#include "enforce/bpf_machine.h"
#include "enforce/domain_of.h"
#include "host/enforce/system_calls.h"
#include "policy/call_set.h"

namespace EnforceTest {
namespace {

using Enforce::CallPlan;
using Enforce::NumberOf;
using Enforce::PlanCalls;
using testing::ElementsAre;
using testing::IsEmpty;

using Numbers = std::initializer_list<std::uint64_t>;

constexpr std::uint64_t kHighBits = std::uint64_t{0xdead} << 32;

CallPlan PlanOf(const std::vector<std::string>& lines) { return PlanCalls(DomainOf(lines)); }

std::string Ask(const CallPlan& plan, const char* call, const Arguments& arguments = {}) {
  return AnswerOf(plan.program, CallOf(NumberOf(call).value(), arguments));
}

std::string Ask(const std::vector<std::string>& lines, const char* call,
                const Arguments& arguments = {}) {
  return Ask(PlanOf(lines), call, arguments);
}

std::vector<std::string> ToldOf(const std::vector<std::string>& lines) {
  return Told(PlanOf(lines).fates);
}

// ---- Calls

TEST(PlanCalls, AllowsWhatOneGrantsAndNoneRevokes) {
  const CallPlan plan = PlanOf({"-s read grant", "-s @memory grant", "-s mmap revoke",
                                "-s @signal revoke", "-s kill grant"});
  EXPECT_EQ(Ask(plan, "read"), "allowed");
  EXPECT_EQ(Ask(plan, "munmap"), "allowed");
  EXPECT_EQ(Ask(plan, "mmap"), "EPERM");
  EXPECT_EQ(Ask(plan, "kill"), "EPERM");
  EXPECT_EQ(Ask(plan, "write"), "EPERM");
  EXPECT_THAT(Told(plan.fates), IsEmpty());
  EXPECT_EQ(plan.fates.size(), 5U);
}

TEST(PlanCalls, RefusesAllWithoutARule) {
  const CallPlan plan = PlanOf({});
  for (const auto& [number, name] : Enforce::SystemCalls()) {
    ASSERT_EQ(AnswerOf(plan.program, CallOf(number)), name == "clone3" ? "ENOSYS" : "EPERM")
        << name;
  }
  EXPECT_EQ(AnswerOf(plan.program, CallOf(999)), "ENOSYS");
}

TEST(PlanCalls, TellsOfCallsThatThisMachineDoesNotHave) {
  EXPECT_THAT(ToldOf({"-s socketcall grant", "-s riscv_flush_icache revoke"}),
              ElementsAre("narrowed: -s socketcall grant (this machine has no such call)"));
}

TEST(PlanCalls, LeavesOtherKindsToOthers) {
  EXPECT_THAT(PlanOf({"-c cap_chown grant", "-p bind_port 80 grant", "-p connect_port 80 revoke",
                      "-a key read grant"})
                  .fates,
              IsEmpty());
}

TEST(PlanCalls, PassesOnRulesThatAreNoRanges) {
  EXPECT_THROW(PlanOf({"-p set_uid ten grant"}), std::exception);
}

// ---- The entry

TEST(PlanCalls, LetsOneExecvePassWithASecret) {
  CallPlan plan = PlanOf({"-s read grant"});
  const Arguments guess = {0, 0, 0, 0, 0, 42};
  ASSERT_TRUE(plan.secret);
  EXPECT_EQ(Ask(plan, "execve", guess), "EPERM");
  SetSecret(plan.program.data(), *plan.secret, 42);
  EXPECT_EQ(Ask(plan, "execve", guess), "allowed");
  EXPECT_EQ(Ask(plan, "execveat", guess), "allowed");
  EXPECT_EQ(Ask(plan, "execve"), "EPERM");
  EXPECT_EQ(Ask(plan, "execveat"), "EPERM");
}

// Or nobody would be told that the program could not be executed.
TEST(PlanCalls, LetsTheLauncherTellAndEndWithTheSecret) {
  CallPlan plan = PlanOf({"-s read grant", "-s write revoke"});
  const Arguments guess = {0, 0, 0, 0, 0, 42};
  ASSERT_TRUE(plan.secret);
  SetSecret(plan.program.data(), *plan.secret, 42);
  for (const char* const call : {"write", "exit_group"}) {
    EXPECT_EQ(Ask(plan, call, guess), "allowed") << call;
    EXPECT_EQ(Ask(plan, call), "EPERM") << call;
  }
  EXPECT_EQ(Ask(plan, "exit", guess), "EPERM");
}

TEST(PlanCalls, NeedsNoSecretWhereAllIsGrantedThatTheLauncherCalls) {
  const CallPlan plan =
      PlanOf({"-s execve grant", "-s execveat grant", "-s exit_group grant", "-s write grant"});
  EXPECT_FALSE(plan.secret);
  EXPECT_EQ(Ask(plan, "execve"), "allowed");
  EXPECT_EQ(Ask(plan, "execveat"), "allowed");
}

// The launcher executes a program by its descriptor, too.
TEST(PlanCalls, LetsOneExecveatPassWhereExecveIsGranted) {
  const Arguments guess = {0, 0, 0, 0, 0, 42};
  CallPlan plan = PlanOf({"-s execve grant"});
  ASSERT_TRUE(plan.secret);
  SetSecret(plan.program.data(), *plan.secret, 42);
  EXPECT_EQ(Ask(plan, "execve"), "allowed");
  EXPECT_EQ(Ask(plan, "execveat", guess), "allowed");
  EXPECT_EQ(Ask(plan, "execveat"), "EPERM");
}

TEST(PlanCalls, LeavesExecveatGranted) {
  const CallPlan plan = PlanOf({"-s execveat grant"});
  EXPECT_TRUE(plan.secret);
  EXPECT_EQ(Ask(plan, "execve"), "EPERM");
  EXPECT_EQ(Ask(plan, "execveat"), "allowed");
}

// ---- Arguments

struct ArgumentCase {
  const char* check;
  const char* call;
  std::size_t argument;
  std::uint64_t others = 0;  // what the other arguments are
};
constexpr ArgumentCase kArgumentCases[] = {
    {"socket_family", "socket", 0},
    {"socket_family", "socketpair", 0},
    {"socket_type", "socket", 1},
    {"socket_type", "socketpair", 1},
    {"ioctl_request", "ioctl", 1},
    {"prctl_option", "prctl", 0},
    {"kill_signal", "kill", 1},
    {"kill_signal", "tkill", 1},
    {"kill_signal", "tgkill", 2},
    {"kill_signal", "rt_sigqueueinfo", 1},
    {"kill_signal", "rt_tgsigqueueinfo", 2},
    {"kill_signal", "pidfd_send_signal", 1},
    {"set_uid", "setuid", 0},
    {"set_uid", "setfsuid", 0},
    {"set_uid", "setreuid", 0, 7},
    {"set_uid", "setreuid", 1, 7},
    {"set_uid", "setresuid", 0, 7},
    {"set_uid", "setresuid", 1, 7},
    {"set_uid", "setresuid", 2, 7},
    {"set_gid", "setgid", 0},
    {"set_gid", "setfsgid", 0},
    {"set_gid", "setregid", 0, 7},
    {"set_gid", "setregid", 1, 7},
    {"set_gid", "setresgid", 0, 7},
    {"set_gid", "setresgid", 1, 7},
    {"set_gid", "setresgid", 2, 7},
};

Arguments With(const ArgumentCase& each, std::uint64_t value) {
  Arguments arguments;
  arguments.fill(each.others);
  arguments.at(each.argument) = value;
  return arguments;
}

TEST(PlanCalls, ChecksTheArgumentOfEachCheck) {
  for (const ArgumentCase& each : kArgumentCases) {
    SCOPED_TRACE(std::string(each.call) + " by " + each.check);
    const std::string granted = std::string("-s ") + each.call + " grant";
    const std::string check = std::string("-p ") + each.check;
    const CallPlan open = PlanOf({granted});
    const CallPlan listed = PlanOf({granted, check + " 5 7 grant", check + " 6 revoke"});
    const CallPlan except = PlanOf({granted, check + " 6 revoke"});
    EXPECT_EQ(Ask(open, each.call, With(each, 6)), "allowed");
    EXPECT_EQ(Ask(listed, each.call, With(each, 4)), "EPERM");
    EXPECT_EQ(Ask(listed, each.call, With(each, 5)), "allowed");
    EXPECT_EQ(Ask(listed, each.call, With(each, 6)), "EPERM");
    EXPECT_EQ(Ask(listed, each.call, With(each, 7)), "allowed");
    EXPECT_EQ(Ask(listed, each.call, With(each, 8)), "EPERM");
    EXPECT_EQ(Ask(listed, each.call, With(each, 7 | kHighBits)), "allowed");
    EXPECT_EQ(Ask(listed, each.call, With(each, 6 | kHighBits)), "EPERM");
    EXPECT_EQ(Ask(except, each.call, With(each, 5)), "allowed");
    EXPECT_EQ(Ask(except, each.call, With(each, 6)), "EPERM");
  }
}

TEST(PlanCalls, AsksForTheCallAsWell) {
  EXPECT_EQ(Ask({"-p kill_signal 0 64 grant"}, "kill", {0, 9}), "EPERM");
}

TEST(PlanCalls, LeavesIdentitiesUnchanged) {
  const std::vector<std::string> lines = {"-s @identity grant", "-p set_uid 1000 grant",
                                          "-p set_gid 1000 grant"};
  EXPECT_EQ(Ask(lines, "setreuid", {0xffff'ffff, 1000}), "allowed");
  EXPECT_EQ(Ask(lines, "setresgid", {~std::uint64_t{0}, 1000, 0xffff'ffff}), "allowed");
  EXPECT_EQ(Ask(lines, "setreuid", {0xffff'ffff, 0}), "EPERM");
  EXPECT_EQ(Ask(lines, "setfsuid", {0xffff'ffff}), "allowed");
}

TEST(PlanCalls, LooksAtTypesOfSocketsWithoutTheirFlags) {
  const std::vector<std::string> lines = {"-s socket grant", "-p socket_type 1 grant"};
  EXPECT_EQ(Ask(lines, "socket", {AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK}), "allowed");
  EXPECT_EQ(Ask(lines, "socket", {AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC}), "EPERM");
}

// ---- Flags of clone

TEST(PlanCalls, TakesCloneFlagsAsAMask) {
  const CallPlan plan = PlanOf({"-s clone grant", "-s unshare grant", "-p clone_flags 0x300 grant",
                                "-p clone_flags 0x10000411 grant", "-p clone_flags 0x200 revoke"});
  for (const std::uint64_t flags : Numbers{0x0, 0x11, 0x100, 0x10000511, 0x4000ff}) {
    EXPECT_EQ(Ask(plan, "clone", {flags & ~std::uint64_t{0x400000}}), "allowed") << flags;
  }
  for (const std::uint64_t flags : Numbers{0x200, 0x300, 0x211, 0x800, 0x20000000}) {
    EXPECT_EQ(Ask(plan, "clone", {flags}), "EPERM") << flags;
  }
  EXPECT_EQ(Ask(plan, "unshare", {CLONE_NEWUSER}), "allowed");
  EXPECT_EQ(Ask(plan, "unshare", {CLONE_NEWUSER | CLONE_NEWNS}), "EPERM");
  EXPECT_THAT(Told(plan.fates),
              ElementsAre("narrowed: -s unshare grant (unshare: a new time namespace is refused "
                          "unless clone_flags grants 0x80)"));
}

TEST(PlanCalls, RefusesRevokedFlagsOnly) {
  const CallPlan plan = PlanOf({"-s clone grant", "-p clone_flags 0x100 revoke"});
  EXPECT_EQ(Ask(plan, "clone", {CLONE_FS | SIGCHLD}), "allowed");
  EXPECT_EQ(Ask(plan, "clone", {CLONE_FS | CLONE_VM}), "EPERM");
}

TEST(PlanCalls, RefusesNewNamespacesThatNoRuleGrants) {
  const std::vector<std::string> lines = {"-s clone grant", "-s unshare grant"};
  for (const std::uint64_t flag : Numbers{CLONE_NEWNS, CLONE_NEWCGROUP, CLONE_NEWUTS, CLONE_NEWIPC,
                                          CLONE_NEWUSER, CLONE_NEWPID, CLONE_NEWNET}) {
    EXPECT_EQ(Ask(lines, "clone", {flag | SIGCHLD}), "EPERM") << flag;
    EXPECT_EQ(Ask(lines, "unshare", {flag}), "EPERM") << flag;
    EXPECT_EQ(Ask({"-s unshare grant", "-p clone_flags " + std::to_string(flag) + " grant"},
                  "unshare", {flag}),
              "allowed")
        << flag;
  }
  EXPECT_EQ(Ask(lines, "clone", {CLONE_VM | CLONE_FS | SIGCHLD}), "allowed");
  EXPECT_EQ(Ask(lines, "unshare", {CLONE_FS | CLONE_FILES}), "allowed");
  EXPECT_THAT(ToldOf(lines), ElementsAre("narrowed: -s clone grant (clone: new namespaces are "
                                         "refused unless clone_flags grants them)",
                                         "narrowed: -s unshare grant (unshare: new namespaces are "
                                         "refused unless clone_flags grants "
                                         "them)"));
}

// To clone these bits are the signal of the child.
TEST(PlanCalls, KnowsTheTimeNamespaceOfUnshare) {
  EXPECT_EQ(Ask({"-s clone grant"}, "clone", {CLONE_NEWTIME}), "allowed");
  EXPECT_EQ(Ask({"-s unshare grant"}, "unshare", {CLONE_NEWTIME}), "EPERM");
  EXPECT_EQ(Ask({"-s unshare grant", "-p clone_flags 0x80 grant"}, "unshare", {CLONE_NEWTIME}),
            "allowed");
}

TEST(PlanCalls, RefusesToUnshareWhatItDoesNotKnow) {
  const std::vector<std::string> lines = {"-s unshare grant", "-p clone_flags 0xffffffff grant"};
  EXPECT_EQ(Ask(lines, "unshare", {CLONE_NEWUSER}), "allowed");
  EXPECT_EQ(Ask(lines, "unshare", {CLONE_PARENT_SETTID}), "EPERM");
  EXPECT_EQ(Ask(lines, "unshare", {std::uint64_t{1} << 32}), "EPERM");
}

TEST(PlanCalls, AnswersClone3AsUnknown) {
  const std::vector<std::string> lines = {"-s clone3 grant", "-p clone_flags 0xffffffff grant"};
  EXPECT_EQ(Ask(lines, "clone3"), "ENOSYS");
  EXPECT_EQ(Ask({"-s clone3 grant"}, "clone3"), "ENOSYS");
  EXPECT_EQ(Ask({"-s clone grant"}, "clone3"), "ENOSYS");
  EXPECT_EQ(Ask({"-s clone3 revoke"}, "clone3"), "ENOSYS");
  EXPECT_THAT(ToldOf(lines),
              ElementsAre("narrowed: -s clone3 grant (clone3: answered as unknown, so "
                          "that programs use clone)"));
}

// ---- Values that reach past the domain

TEST(PlanCalls, RefusesRequestsThatReachPastTheRules) {
  for (const std::uint64_t request :
       Numbers{TIOCSTI, TIOCLINUX, FS_IOC_SETFLAGS, FS_IOC_FSSETXATTR}) {
    const std::string check = "-p ioctl_request " + std::to_string(request);
    EXPECT_EQ(Ask({"-s ioctl grant"}, "ioctl", {0, request}), "EPERM");
    EXPECT_EQ(Ask({"-s ioctl grant"}, "ioctl", {0, request | kHighBits}), "EPERM");
    EXPECT_EQ(Ask({"-s ioctl grant", "-p ioctl_request 0 0xffffffff grant"}, "ioctl", {0, request}),
              "EPERM");
    EXPECT_EQ(Ask({"-s ioctl grant", check + " grant"}, "ioctl", {0, request}), "allowed");
    EXPECT_EQ(Ask({"-s ioctl grant", check + " grant", check + " revoke"}, "ioctl", {0, request}),
              "EPERM");
  }
  EXPECT_EQ(Ask({"-s ioctl grant"}, "ioctl", {0, TIOCGWINSZ}), "allowed");
}

TEST(PlanCalls, TellsWhoWouldGrantSuchRequests) {
  EXPECT_THAT(ToldOf({"-s ioctl grant", "-s kill grant"}),
              ElementsAre("narrowed: -s ioctl grant (ioctl: TIOCSTI is refused unless granted by "
                          "itself; ioctl: TIOCLINUX is refused unless granted by itself; "
                          "ioctl: FS_IOC_SETFLAGS is refused unless granted by itself; "
                          "ioctl: FS_IOC_FSSETXATTR is refused unless granted by itself)"));
  EXPECT_THAT(
      ToldOf({"-s ioctl grant", "-p ioctl_request 0x5400 0x5412 grant",
              "-p ioctl_request 0x5413 grant", "-p ioctl_request 0x541c grant"}),
      ElementsAre("narrowed: -p ioctl_request 0x5400 0x5412 grant (TIOCSTI is refused unless "
                  "granted by itself)"));
  EXPECT_THAT(ToldOf({"-s ioctl grant", "-p ioctl_request 0x5401 grant"}), IsEmpty());
  EXPECT_THAT(ToldOf({"-s ioctl revoke", "-s ioctl grant"}), IsEmpty());
}

TEST(PlanCalls, RefusesToSayWhatProgramRuns) {
  EXPECT_EQ(Ask({"-s prctl grant"}, "prctl", {PR_SET_MM}), "EPERM");
  EXPECT_EQ(Ask({"-s prctl grant"}, "prctl", {PR_SET_NAME}), "allowed");
  EXPECT_EQ(Ask({"-s prctl grant", "-p prctl_option 35 grant"}, "prctl", {PR_SET_MM}), "allowed");
}

// ---- Signals

TEST(PlanCalls, ChecksSignalsOfDescriptors) {
  const std::vector<std::string> lines = {"-s fcntl grant", "-s ioctl grant", "-s tkill grant",
                                          "-p kill_signal 15 grant"};
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_GETFD, 9}), "allowed");
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETSIG, 15}), "allowed");
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETSIG, 9}), "EPERM");
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETSIG, 0}), "EPERM");
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETOWN, 1}), "EPERM");
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETOWN_EX, 1}), "EPERM");
  EXPECT_EQ(Ask(lines, "ioctl", {0, FIOSETOWN}), "EPERM");
  EXPECT_EQ(Ask(lines, "ioctl", {0, SIOCSPGRP}), "EPERM");
  EXPECT_EQ(Ask({"-s fcntl grant", "-s kill grant"}, "fcntl", {0, F_SETOWN, 1}), "allowed");
}

TEST(PlanCalls, LeavesOwnersOfDescriptorsToWhoMaySendTheirSignals) {
  const std::vector<std::string> lines = {"-s fcntl grant", "-s ioctl grant", "-s kill grant",
                                          "-p kill_signal 9 revoke"};
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETOWN, 1}), "allowed");
  EXPECT_EQ(Ask(lines, "ioctl", {0, SIOCSPGRP}), "allowed");
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETSIG, 0}), "allowed");
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETSIG, 9}), "EPERM");
}

TEST(PlanCalls, SendsNoSignalsByDescriptorsWhereNoCallMay) {
  const std::vector<std::string> lines = {"-s @io grant",     "-s @signal grant",
                                          "-s kill revoke",   "-s pidfd_send_signal revoke",
                                          "-s tgkill revoke", "-s rt_sigqueueinfo revoke",
                                          "-s tkill revoke",  "-s rt_tgsigqueueinfo revoke"};
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETSIG, 9}), "EPERM");
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETOWN, 1}), "EPERM");
  EXPECT_EQ(Ask(lines, "ioctl", {0, FIOSETOWN}), "EPERM");
  EXPECT_EQ(Ask(lines, "fcntl", {0, F_SETFL, 1}), "allowed");
}

TEST(PlanCalls, RefusesGroupsThatItCannotSee) {
  EXPECT_EQ(Ask({"-s setgroups grant"}, "setgroups"), "allowed");
  EXPECT_EQ(Ask({"-s setgroups grant", "-p set_gid 5 grant"}, "setgroups"), "EPERM");
  EXPECT_EQ(Ask({"-s setgroups grant", "-p set_uid 5 grant"}, "setgroups"), "allowed");
  EXPECT_THAT(ToldOf({"-s setgroups grant", "-p set_gid 0 revoke"}),
              ElementsAre("narrowed: -s setgroups grant (setgroups: refused beside set_gid, as no "
                          "filter sees its groups)"));
}

// ---- Past ports

TEST(PlanCalls, LeavesOnlyTcpBesidePorts) {
  for (const char* const rule : {"-p connect_port 443 grant", "-p bind_port 80 revoke"}) {
    const std::vector<std::string> lines = {"-s socket grant", rule};
    for (const std::uint64_t family : Numbers{AF_INET, AF_INET6}) {
      EXPECT_EQ(Ask(lines, "socket", {family, SOCK_STREAM, 0}), "allowed");
      EXPECT_EQ(Ask(lines, "socket", {family, SOCK_STREAM | SOCK_CLOEXEC, IPPROTO_TCP}), "allowed");
      EXPECT_EQ(Ask(lines, "socket", {family | kHighBits, SOCK_DGRAM, 0}), "EPERM");
      EXPECT_EQ(Ask(lines, "socket", {family, SOCK_DGRAM | SOCK_NONBLOCK, IPPROTO_UDP}), "EPERM");
      EXPECT_EQ(Ask(lines, "socket", {family, SOCK_RAW, IPPROTO_TCP}), "EPERM");
      EXPECT_EQ(Ask(lines, "socket", {family, SOCK_STREAM, 262 /* MPTCP */}), "EPERM");
      EXPECT_EQ(Ask(lines, "socket", {family, SOCK_STREAM, 256 /* SMC */}), "EPERM");
      EXPECT_EQ(Ask(lines, "socket", {family, SOCK_STREAM, IPPROTO_SCTP}), "EPERM");
    }
    for (const std::uint64_t family : Numbers{AF_PACKET, AF_SMC, AF_RDS, AF_XDP, 46, 1000}) {
      EXPECT_EQ(Ask(lines, "socket", {family, SOCK_STREAM, 0}), "EPERM") << family;
    }
    for (const std::uint64_t family : Numbers{AF_UNIX, AF_NETLINK, AF_VSOCK}) {
      EXPECT_EQ(Ask(lines, "socket", {family, SOCK_DGRAM, 0}), "allowed") << family;
    }
  }
  EXPECT_EQ(Ask({"-s socket grant"}, "socket", {AF_INET, SOCK_DGRAM, 0}), "allowed");
}

TEST(PlanCalls, LeavesAllSocketsBesideChecksThatAllPortsPass) {
  const std::vector<std::string> lines = {"-s @network grant", "-p connect_port 0 65535 grant",
                                          "-p bind_port 70000 revoke",
                                          "-p socket_family 2 45 grant"};
  EXPECT_EQ(Ask(lines, "socket", {AF_INET, SOCK_DGRAM, 0}), "allowed");
  EXPECT_EQ(Ask(lines, "sendto", {0, 0, 0, MSG_FASTOPEN}), "allowed");
  EXPECT_EQ(Ask(lines, "listen"), "allowed");
  EXPECT_THAT(ToldOf(lines), IsEmpty());
}

TEST(PlanCalls, RefusesUnixSocketsThatReachWhoeverListens) {
  for (const char* const call : {"connect", "sendto", "sendmsg", "sendmmsg"}) {
    const std::vector<std::string> lines = {std::string("-s ") + call + " grant", "-s socket grant",
                                            "-s socketpair grant"};
    EXPECT_EQ(Ask(lines, "socket", {AF_UNIX, SOCK_STREAM, 0}), "EPERM") << call;
    EXPECT_EQ(Ask(lines, "socket", {AF_INET, SOCK_STREAM, 0}), "allowed") << call;
    EXPECT_EQ(Ask(lines, "socketpair", {AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0}), "allowed");
    EXPECT_EQ(Ask(lines, "socketpair", {AF_UNIX, SOCK_SEQPACKET, 0}), "allowed") << call;
    EXPECT_EQ(Ask(lines, "socketpair", {AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK, 0}), "EPERM") << call;
    EXPECT_EQ(Ask(lines, "socketpair", {AF_UNIX, SOCK_RAW, 0}), "EPERM") << call;
    EXPECT_THAT(ToldOf(lines),
                ElementsAre("narrowed: -s socket grant (socket: unix sockets are refused unless "
                            "socket_family grants 1, as they reach whoever listens)",
                            "narrowed: -s socketpair grant (socketpair: pairs that are neither "
                            "SOCK_STREAM nor SOCK_SEQPACKET are refused unless socket_family "
                            "grants 1, as they reach whoever listens)"));
  }
}

TEST(PlanCalls, LeavesUnixSocketsToWhoOnlyListens) {
  const std::vector<std::string> lines = {"-s socket grant", "-s bind grant", "-s listen grant",
                                          "-s accept4 grant"};
  EXPECT_EQ(Ask(lines, "socket", {AF_UNIX, SOCK_STREAM, 0}), "allowed");
  EXPECT_EQ(Ask({"-s socketpair grant"}, "socketpair", {AF_UNIX, SOCK_DGRAM, 0}), "allowed");
  EXPECT_THAT(ToldOf(lines), IsEmpty());
}

TEST(PlanCalls, TellsThatGrantedUnixSocketsReachWhoeverListens) {
  const std::vector<std::string> lines = {"-s socket grant", "-s connect grant",
                                          "-p socket_family 1 grant"};
  EXPECT_EQ(Ask(lines, "socket", {AF_UNIX, SOCK_STREAM, 0}), "allowed");
  EXPECT_THAT(ToldOf(lines),
              ElementsAre("notExpressible: -p socket_family 1 grant (beside connect or sending, a "
                          "unix socket reaches whoever listens: this kernel has no rules for "
                          "that)"));
}

TEST(PlanCalls, RefusesToConnectBySending) {
  const std::vector<std::string> lines = {"-s @network grant", "-p connect_port 443 grant"};
  for (const char* const call : {"sendto", "sendmmsg"}) {
    EXPECT_EQ(Ask(lines, call, {0, 0, 0, MSG_FASTOPEN | MSG_DONTWAIT}), "EPERM");
    EXPECT_EQ(Ask(lines, call, {0, 0, MSG_FASTOPEN, MSG_DONTWAIT}), "allowed");
  }
  EXPECT_EQ(Ask(lines, "sendmsg", {0, 0, MSG_FASTOPEN | kHighBits}), "EPERM");
  EXPECT_EQ(Ask(lines, "sendmsg", {0, 0, MSG_DONTWAIT, MSG_FASTOPEN}), "allowed");
  EXPECT_EQ(Ask({"-s @network grant", "-p bind_port 80 grant"}, "sendmsg", {0, 0, MSG_FASTOPEN}),
            "allowed");
}

TEST(PlanCalls, RefusesToListenWithoutAPort) {
  EXPECT_EQ(Ask({"-s listen grant", "-p bind_port 80 grant"}, "listen"), "EPERM");
  EXPECT_EQ(Ask({"-s listen grant", "-p bind_port 0 revoke"}, "listen"), "EPERM");
  EXPECT_EQ(Ask({"-s listen grant", "-p bind_port 80 grant", "-p bind_port 0 grant"}, "listen"),
            "allowed");
  EXPECT_EQ(Ask({"-s listen grant", "-p bind_port 80 revoke"}, "listen"), "allowed");
  EXPECT_EQ(Ask({"-s listen grant", "-p connect_port 80 grant"}, "listen"), "allowed");
}

TEST(PlanCalls, RefusesToChangeTheProtocolOfASocket) {
  const std::vector<std::string> lines = {"-s setsockopt grant", "-p connect_port 443 grant"};
  EXPECT_EQ(Ask(lines, "setsockopt", {0, IPPROTO_TCP, TCP_ULP}), "EPERM");
  EXPECT_EQ(Ask(lines, "setsockopt", {0, IPPROTO_TCP, TCP_NODELAY}), "allowed");
  EXPECT_EQ(Ask(lines, "setsockopt", {0, SOL_SOCKET, TCP_ULP}), "allowed");
  EXPECT_EQ(Ask({"-s setsockopt grant"}, "setsockopt", {0, IPPROTO_TCP, TCP_ULP}), "allowed");
}

// ---- Limits

TEST(PlanCalls, ChangesNoLimitsOfOtherProcesses) {
  constexpr std::uint64_t kFarPointer = std::uint64_t{1} << 32;
  const std::vector<std::string> lines = {"-s prlimit64 grant"};
  for (const std::uint64_t limits : {std::uint64_t{0x1000}, kFarPointer}) {
    EXPECT_EQ(Ask(lines, "prlimit64", {1, RLIMIT_CPU, limits, 0}), "EPERM");
    EXPECT_EQ(Ask(lines, "prlimit64", {0, RLIMIT_CPU, limits, 0}), "allowed");
    EXPECT_EQ(Ask(lines, "prlimit64", {kHighBits, RLIMIT_CPU, limits, 0}), "allowed");
  }
  EXPECT_EQ(Ask(lines, "prlimit64", {1, RLIMIT_CPU, 0, 0x1000}), "allowed");
  EXPECT_THAT(ToldOf(lines),
              ElementsAre("narrowed: -s prlimit64 grant (prlimit64: the limits of other processes "
                          "are not changed)"));
}

// ---- Rings

TEST(PlanCalls, LeavesRingsToNobody) {
  std::vector<std::string> lines;
  for (const auto& [number, name] : Enforce::SystemCalls()) {
    lines.push_back("-s " + name + " grant");
  }
  const CallPlan plan = PlanOf(lines);
  for (const char* const call : {"io_uring_setup", "io_uring_enter", "io_uring_register"}) {
    EXPECT_EQ(Ask(plan, call), "EPERM");
  }
  EXPECT_THAT(ToldOf({"-s io_uring_setup grant"}),
              ElementsAre("narrowed: -s io_uring_setup grant (io_uring_setup: refused, as no "
                          "filter sees what a ring does)"));
}

// ---- Truncation

CallPlan PlanThatTruncatesNothing(const std::vector<std::string>& lines) {
  return PlanCalls(DomainOf(lines), Enforce::Truncation::kByFilter);
}

TEST(PlanCalls, TruncatesNoFileThatIsNotOpenedForWriting) {
  const CallPlan plan = PlanThatTruncatesNothing({"-s @file grant", "-s open_by_handle_at grant"});
  constexpr std::uint64_t kNeither = O_ACCMODE;  // for ioctl alone
  for (const std::uint64_t flags : Numbers{O_TRUNC, O_TRUNC | O_CREAT, O_TRUNC | O_CLOEXEC,
                                           O_TRUNC | kNeither, kHighBits | O_TRUNC}) {
    EXPECT_EQ(Ask(plan, "open", {0, flags}), "EACCES") << flags;
    EXPECT_EQ(Ask(plan, "openat", {0, 0, flags}), "EACCES") << flags;
    EXPECT_EQ(Ask(plan, "open_by_handle_at", {0, 0, flags}), "EACCES") << flags;
  }
  for (const std::uint64_t flags :
       Numbers{O_RDONLY, O_RDONLY | O_CLOEXEC, kNeither, O_WRONLY | O_CREAT | O_TRUNC,
               O_RDWR | O_TRUNC, kHighBits | O_RDONLY}) {
    EXPECT_EQ(Ask(plan, "open", {O_TRUNC, flags}), "allowed") << flags;
    EXPECT_EQ(Ask(plan, "openat", {0, O_TRUNC, flags}), "allowed") << flags;
    EXPECT_EQ(Ask(plan, "open_by_handle_at", {0, O_TRUNC, flags}), "allowed") << flags;
  }
  EXPECT_EQ(Ask(plan, "truncate"), "EACCES");
  EXPECT_EQ(Ask(plan, "ftruncate"), "allowed");
  EXPECT_EQ(Ask(plan, "creat"), "allowed");
}

TEST(PlanCalls, TellsOfTheCallWhoseFlagsNoFilterSees) {
  const CallPlan plan = PlanThatTruncatesNothing({"-s @file grant", "-s openat grant"});
  EXPECT_EQ(Ask(plan, "openat2"), "ENOSYS");
  EXPECT_THAT(Told(plan.fates),
              ElementsAre("narrowed: -s @file grant (openat2: answered as unknown unless granted "
                          "by itself, so that programs use openat)"));
  EXPECT_EQ(Ask({"-s @file grant"}, "openat2"), "allowed");
}

TEST(PlanCalls, RefusesTruncationAsACallWhereNoRuleGrantsIt) {
  const CallPlan plan = PlanThatTruncatesNothing({"-s @file grant", "-s truncate revoke"});
  EXPECT_EQ(Ask(plan, "truncate"), "EPERM");
  EXPECT_EQ(Ask(PlanThatTruncatesNothing({"-s open revoke"}), "open", {0, O_TRUNC}), "EPERM");
}

TEST(IsCallNamed, IsAboutRulesThatGrantTheCallByItself) {
  const auto isNamed = [](const char* line) {
    return Enforce::IsCallNamed(DomainOf({line}), "openat2");
  };
  EXPECT_TRUE(isNamed("-s openat2 grant"));
  EXPECT_FALSE(isNamed("-s openat2 revoke"));
  EXPECT_FALSE(isNamed("-s @file grant"));
  EXPECT_FALSE(isNamed("-s openat grant"));
  EXPECT_FALSE(isNamed("-a openat2 read grant"));
}

// ---- Size

// Two hundred domains of one call more each: the largest filter there can be without checks.
TEST(PlanCalls, StaysShort) {
  std::vector<std::string> everySecond;
  for (const auto& [number, name] : Enforce::SystemCalls()) {
    if (number % 2 == 0) everySecond.push_back("-s " + name + " grant");
  }
  const CallPlan plan = PlanOf(everySecond);
  EXPECT_EQ(RefusalOf(plan.program), "");
  EXPECT_LT(plan.program.size(), 1000U);
}

std::vector<std::string> ManyValues(const std::string& check, int count) {
  std::vector<std::string> lines;
  for (int value = 0; value < count; ++value) {
    lines.push_back("-p " + check + " " + std::to_string(1000 + 2 * value) + " grant");
  }
  return lines;
}

TEST(PlanCalls, RefusesAllValuesOfACheckThatHasTooMany) {
  std::vector<std::string> lines = ManyValues("ioctl_request", 900);
  lines.insert(lines.end(), {"-s ioctl grant", "-s kill grant", "-p kill_signal 15 grant"});
  const CallPlan fits = PlanOf(lines);
  EXPECT_EQ(Ask(fits, "ioctl", {0, 1002}), "allowed");
  EXPECT_THAT(Told(fits.fates), IsEmpty());

  std::vector<std::string> more = ManyValues("ioctl_request", 3000);
  more.insert(more.end(), {"-s ioctl grant", "-s kill grant", "-p kill_signal 15 grant"});
  const CallPlan plan = PlanOf(more);
  EXPECT_EQ(RefusalOf(plan.program), "");
  EXPECT_EQ(Ask(plan, "ioctl", {0, 1002}), "EPERM");
  EXPECT_EQ(Ask(plan, "kill", {0, 15}), "allowed");
  ASSERT_EQ(Told(plan.fates).size(), 3000U);
  EXPECT_EQ(
      Told(plan.fates).front(),
      "narrowed: -p ioctl_request 1000 grant (refused, as ioctl_request has more values than a "
      "filter has room for)");
}

TEST(PlanCalls, TellsTheCallsWhereTooManyValuesAreRevoked) {
  std::vector<std::string> lines = {"-s prctl grant"};
  for (int value = 0; value < 3000; ++value) {
    lines.push_back("-p prctl_option " + std::to_string(1000 + 2 * value) + " revoke");
  }
  const CallPlan plan = PlanOf(lines);
  EXPECT_EQ(Ask(plan, "prctl", {PR_SET_NAME}), "EPERM");
  EXPECT_THAT(
      Told(plan.fates),
      ElementsAre("narrowed: -s prctl grant (prctl: refused, as prctl_option has more values "
                  "than a filter has room for)"));
}

// ---- Beside the module

TEST(PlanCallsBesideModule, RefusesCallsAndLeavesTheirArgumentsToTheModule) {
  const CallPlan plan = Enforce::PlanCallsBesideModule(
      DomainOf({"-s @start grant", "-s socket grant", "-s connect grant", "-s setgroups grant",
                "-s setuid grant", "-s clone grant", "-s listen grant", "-s read revoke",
                "-p socket_family 2 grant", "-p set_uid 7 grant", "-p set_gid 7 grant",
                "-p bind_port 80 grant", "-p clone_flags 0 grant"}));
  EXPECT_EQ(Ask(plan, "read"), "EPERM");
  EXPECT_EQ(Ask(plan, "fsync"), "EPERM");
  EXPECT_EQ(Ask(plan, "socket", {AF_UNIX, SOCK_DGRAM, 0}), "allowed");
  EXPECT_EQ(Ask(plan, "setuid", {8}), "allowed");
  EXPECT_EQ(Ask(plan, "setgroups"), "allowed");
  EXPECT_EQ(Ask(plan, "clone", {CLONE_NEWUSER}), "allowed");
  EXPECT_EQ(Ask(plan, "listen"), "allowed");
  EXPECT_THAT(Told(plan.fates), IsEmpty());
  EXPECT_EQ(plan.fates.size(), 12U);
}

TEST(PlanCallsBesideModule, LeavesClone3ToWhoIsGrantedIt) {
  const auto answerTo = [](const std::vector<std::string>& lines) {
    return Ask(Enforce::PlanCallsBesideModule(DomainOf(lines)), "clone3");
  };
  EXPECT_EQ(answerTo({"-s clone3 grant"}), "allowed");
  EXPECT_EQ(answerTo({"-s clone grant"}), "ENOSYS");
  EXPECT_EQ(answerTo({"-s clone3 grant", "-s @process revoke"}), "ENOSYS");
}

TEST(PlanCallsBesideModule, RefusesWhatReachesPastTheRules) {
  const CallPlan plan = Enforce::PlanCallsBesideModule(
      DomainOf({"-s ioctl grant", "-s io_uring_setup grant", "-p ioctl_request 0 0xffff grant"}));
  EXPECT_EQ(Ask(plan, "ioctl", {0, TIOCSTI}), "EPERM");
  EXPECT_EQ(Ask(plan, "ioctl", {0, 0x12345678}), "allowed");
  EXPECT_EQ(Ask(plan, "io_uring_setup"), "EPERM");
  EXPECT_EQ(Told(plan.fates).size(), 2U);
}

}  // namespace
}  // namespace EnforceTest
