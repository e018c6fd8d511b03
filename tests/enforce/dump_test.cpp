// Plans for people: hunts for a plan that is shown otherwise than it is.

#include "host/enforce/plan/dump.h"

#include <gtest/gtest.h>
#include <linux/capability.h>

#include "enforce/domain_of.h"

namespace EnforceTest {
namespace {

using Enforce::PlanCalls;
using Enforce::PlanCapabilities;
using Enforce::PlanNet;

constexpr unsigned int kLast = CAP_CHECKPOINT_RESTORE;
constexpr int kAbi = 4;

TEST(Dump, ShowsCalls) {
  EXPECT_EQ(
      Dump(PlanCalls(DomainOf(
          {"-s read grant", "-s write grant", "-s close grant", "-s clone3 grant", "-s ioctl grant",
           "-s socket grant", "-s tgkill grant", "-s kill grant", "-s write revoke",
           "-p ioctl_request 0x5401 grant", "-p ioctl_request 0x80045430 grant",
           "-p kill_signal 1 15 grant", "-p kill_signal 9 revoke", "-p socket_family 1 grant",
           "-p socket_type 0 2 grant", "-c cap_chown grant"}))),
      "answered as unknown: clone3\n"
      "allowed: close read\n"
      "allowed where argument 1 in 1, and argument 2 & 255 in 0-2: socket\n"
      "allowed where argument 2 in 1-8 10-15: kill\n"
      "allowed where argument 2 in 21505 0x80045430: ioctl\n"
      "allowed where argument 3 in 1-8 10-15: tgkill\n"
      "refused but to enter: execve execveat exit_group write\n"
      "refused: all others\n");
}

TEST(Dump, ShowsWhatIsClosedBesides) {
  EXPECT_EQ(
      Dump(PlanCalls(DomainOf({"-s socket grant", "-s sendto grant", "-s unshare grant",
                               "-s execve grant", "-p connect_port 443 grant"}))),
      "answered as unknown: clone3\n"
      "allowed: execve\n"
      "allowed where argument 1 & 0xfffaf0ff in 0, and upper half of argument 1 in 0: unshare\n"
      "allowed where argument 1 in 0 2-0xffffffff, and argument 1 in 0-16 18-20 22-23 25-29 31-32 "
      "34-40 42 45, and argument 1 in 0-1 "
      "3-9 11-0xffffffff or argument 2 & 255 in 1, and argument 1 in 0-1 3-9 11-0xffffffff or "
      "argument 3 in 0 6: socket\n"
      "allowed where argument 4 & 0x20000000 in 0: sendto\n"
      "refused but to enter: execveat exit_group write\n"
      "refused: all others\n");
}

TEST(Dump, ShowsWhatIsRefusedAsByLandlock) {
  EXPECT_EQ(Dump(PlanCalls(DomainOf({"-s openat grant", "-s truncate grant", "-s execve grant"}),
                           Enforce::Truncation::kByFilter)),
            "answered as unknown: clone3 openat2\n"
            "refused with EACCES: truncate\n"
            "allowed: execve\n"
            "allowed where argument 3 & 512 in 0 or argument 3 & 3 in 1-2, else refused with "
            "EACCES: openat\n"
            "refused but to enter: execveat exit_group write\n"
            "refused: all others\n");
}

TEST(Dump, ShowsCapabilities) {
  EXPECT_EQ(Dump(PlanCapabilities(
                DomainOf({"-c cap_kill grant", "-c cap_chown grant", "-c cap_syslog grant"}),
                1U << CAP_KILL | 1U << CAP_CHOWN, kLast)),
            "capabilities: cap_chown cap_kill\n");
  EXPECT_EQ(Dump(PlanCapabilities(DomainOf({}), 0, kLast)), "capabilities: none\n");
}

TEST(Dump, ShowsPorts) {
  EXPECT_EQ(Dump(PlanNet(DomainOf({"-p bind_port 80 grant", "-p bind_port 443 grant"}), kAbi)),
            "bind_port: 80, 443\n"
            "connect_port: all ports\n");
  EXPECT_EQ(Dump(PlanNet(DomainOf({"-p connect_port 0 65535 revoke"}), kAbi)),
            "bind_port: all ports\n"
            "connect_port: no port\n");
}

TEST(Dump, ShowsRightsToPaths) {
  const Enforce::PathPlan plan = {
      .rights = {{"/srv", Enforce::Landlock::kReadFile | Enforce::Landlock::kReadDir},
                 {"/srv/f", Enforce::Landlock::kIoctlDev | Enforce::Landlock::kExecute}},
      .masks = {{"/srv/private", Enforce::MaskKind::kHidden},
                {"/srv/programs", Enforce::MaskKind::kNoExec}},
      .fates = {}};
  EXPECT_EQ(Dump(plan),
            "rights to files, each also to everything beneath:\n"
            "  /srv: read-file read-dir\n"
            "  /srv/f: execute ioctl-dev\n"
            "hidden by a mount: /srv/private\n"
            "mounted so that nothing is executed: /srv/programs\n");
}

}  // namespace
}  // namespace EnforceTest
