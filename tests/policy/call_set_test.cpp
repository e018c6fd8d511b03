// Sets of system calls: hunts for a member that no kernel has, and for a call in a set that reaches
// past the other rules of a domain.

#include "policy/call_set.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <seccomp.h>

#include <algorithm>
#include <string>

namespace PolicyTest {
namespace {

using Policy::CallSet;
using Policy::CallSets;
using Policy::FindCallSet;
using Policy::SpeaksOfCall;

TEST(CallSets, AreInOrderAndSoAreTheirMembers) {
  EXPECT_TRUE(std::ranges::is_sorted(CallSets(), {},
                                     [](const CallSet& set) { return std::string(set.name); }));
  for (const CallSet& set : CallSets()) {
    EXPECT_EQ(set.name[0], '@');
    EXPECT_TRUE(std::ranges::is_sorted(set.members)) << set.name;
    EXPECT_EQ(std::ranges::adjacent_find(set.members), set.members.end()) << set.name;
  }
}

TEST(CallSets, HaveOnlyCallsThatExist) {
  for (const CallSet& set : CallSets()) {
    for (const std::string_view call : set.members) {
      EXPECT_NE(seccomp_syscall_resolve_name(std::string(call).c_str()), __NR_SCMP_ERROR)
          << set.name << " " << call;
    }
  }
}

TEST(CallSets, LeaveOutWhatReachesPastOtherRules) {
  for (const std::string_view call : {"bpf",
                                      "chroot",
                                      "fsconfig",
                                      "fsmount",
                                      "fsopen",
                                      "fspick",
                                      "io_uring_enter",
                                      "io_uring_register",
                                      "io_uring_setup",
                                      "keyctl",
                                      "memfd_create",
                                      "memfd_secret",
                                      "mount",
                                      "mount_setattr",
                                      "move_mount",
                                      "name_to_handle_at",
                                      "open_by_handle_at",
                                      "open_tree",
                                      "perf_event_open",
                                      "pivot_root",
                                      "process_vm_readv",
                                      "process_vm_writev",
                                      "ptrace",
                                      "setns",
                                      "umount2",
                                      "unshare",
                                      "userfaultfd"}) {
    for (const CallSet& set : CallSets()) EXPECT_FALSE(set.Has(call)) << set.name << " " << call;
  }
}

TEST(CallSets, AreFoundByName) {
  ASSERT_NE(FindCallSet("@start"), nullptr);
  EXPECT_TRUE(FindCallSet("@start")->Has("mmap"));
  EXPECT_FALSE(FindCallSet("@start")->Has("execve"));
  EXPECT_EQ(FindCallSet("start"), nullptr);
  EXPECT_EQ(FindCallSet("@"), nullptr);
}

TEST(CallSets, AWordSpeaksOfItselfAndOfItsMembers) {
  EXPECT_TRUE(SpeaksOfCall("read", "read"));
  EXPECT_TRUE(SpeaksOfCall("@io", "read"));
  EXPECT_FALSE(SpeaksOfCall("read", "write"));
  EXPECT_FALSE(SpeaksOfCall("@network", "read"));
  EXPECT_FALSE(SpeaksOfCall("@none", "read"));
}

}  // namespace
}  // namespace PolicyTest
