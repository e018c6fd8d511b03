// A state on a file system that is full, or that may only be read. The file systems are mounted in
// a namespace of the test's own.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "command.h"
#include "host_root.h"
#include "recorded_load.h"
#include "state_content.h"

namespace CrashTest {
namespace {

class SmallDisk : public ::testing::Test {
 protected:
  void SetUp() override {
    if (unshare(CLONE_NEWNS) != 0 ||
        mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) {
      GTEST_SKIP() << "no mount namespace can be made here: " << std::strerror(errno);
    }
    contents = RecordLoad(root);
  }

  void TearDown() override { umount2(Disk().c_str(), MNT_DETACH); }

  std::string Disk() const { return root.Path() / "run"; }

  void Mount(int kilobytes) const {
    const std::string options = "mode=755,size=" + std::to_string(kilobytes) + "k";
    ASSERT_EQ(mount("tmpfs", Disk().c_str(), "tmpfs", 0, options.c_str()), 0);
  }

  void Remount(unsigned long flags) const {
    ASSERT_EQ(mount("tmpfs", Disk().c_str(), "tmpfs", MS_REMOUNT | flags, "size=64m"), 0)
        << std::strerror(errno);
  }

  HostRoot root;
  std::vector<std::string> contents;
};

TEST_F(SmallDisk, EndsALoadWithAClearErrorAndNothingOfIt) {
  int failures = 0;
  for (int kilobytes = 4; kilobytes < 1500; kilobytes += kilobytes < 160 ? 12 : 300) {
    SCOPED_TRACE(std::to_string(kilobytes) + " kB");
    Mount(kilobytes);
    const Outcome outcome = RunCommand(root.Path(), {"load"});
    ASSERT_GE(outcome.exitStatus, 0);
    if (outcome.exitStatus != 0) {
      ++failures;
      EXPECT_THAT(outcome.errors,
                  ::testing::AnyOf(::testing::HasSubstr("Make room there, and run it again"),
                                   ::testing::EndsWith("kernel.log: No space left on device\n")));
    }

    Remount(0);
    if (std::filesystem::exists(root.State())) {
      EXPECT_EQ(StateFile(root.State()).Integrity(), "ok");
      EXPECT_EQ(RunCommand(root.Path(), {"display"}).exitStatus, 0);
    }
    const Outcome next = RunCommand(root.Path(), {"load"});
    EXPECT_EQ(next.exitStatus, 0) << next.errors;
    EXPECT_EQ(ContentOf(root.State()), contents.back());
    ASSERT_EQ(umount2(Disk().c_str(), MNT_DETACH), 0);
  }
  EXPECT_GT(failures, 0);
}

TEST_F(SmallDisk, RefusesAStateThatMayOnlyBeReadAndLeavesItAlone) {
  Mount(8192);
  ASSERT_EQ(RunCommand(root.Path(), {"load"}).exitStatus, 0);
  const std::string before = ReadFile(root.State());
  Remount(MS_RDONLY);
  for (const char* verb : {"display", "load"}) {
    const Outcome outcome = RunCommand(root.Path(), {verb});
    EXPECT_EQ(outcome.exitStatus, 1);
    EXPECT_NE(outcome.errors.find(
                  "Unable to use the host state /run/secpolicy/host.db: it cannot be written. Make "
                  "it writable, or choose another place\n"),
              std::string::npos)
        << outcome.errors;
    EXPECT_EQ(ReadFile(root.State()), before);
  }

  Remount(0);
  EXPECT_EQ(RunCommand(root.Path(), {"load"}).exitStatus, 0);
  EXPECT_EQ(ContentOf(root.State()), contents.back());
}

}  // namespace
}  // namespace CrashTest
