// What a state says of the kernel that keeps it: hunts for a commit behind which it still says that
// the kernel was told, and for one that is taken for a change and is none.
#include "host/linux/kernel/module_publication.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>

#include "host/linux/state/host_state.h"
#include "host/linux/state/module_place.h"
#include "state_directory.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using LinuxHost::StateBase;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;

class ModulePublication : public ::testing::Test {
 protected:
  ModulePublication() {
    StateBase::TakeCommitForModule();
    directory.Write("module.published", "1\n");
  }

  void Keep() const { directory.Write("module", ""); }

  bool IsPublished() const {
    return std::filesystem::exists(LinuxHost::PublishedMarkOf(directory.Database()));
  }

  const StateDirectory directory;
  HostState& state = HostState::Current();
  const unsigned int domain = state.Domains().Create("a", TESKACCESS_DEFAULT_DOM_NONE, false);
};

TEST_F(ModulePublication, ACommitToAKeptStateIsSeenBeforeItIsTold) {
  Keep();
  EXPECT_TRUE(LinuxHost::IsStateOfModule());
  EXPECT_TRUE(IsPublished());
  state.Domains().SetLevel("a", "permissive");
  EXPECT_FALSE(IsPublished());
  EXPECT_TRUE(StateBase::TakeCommitForModule());
  EXPECT_FALSE(StateBase::TakeCommitForModule());
}

TEST_F(ModulePublication, WhatWasUndoneIsNoCommit) {
  Keep();
  {
    const LinuxHost::Transaction undone(state.Database());
    state.Database().Run("UPDATE domain SET level = 'permissive'");
  }
  EXPECT_TRUE(IsPublished());
  EXPECT_FALSE(StateBase::TakeCommitForModule());
}

TEST_F(ModulePublication, AProcessThatIsPlacedChangesNoPolicy) {
  Keep();
  state.Worlds().Record(getpid(), domain);
  EXPECT_TRUE(IsPublished());
  EXPECT_FALSE(StateBase::TakeCommitForModule());
}

TEST_F(ModulePublication, AStateThatNoModuleKeepsTellsNobody) {
  EXPECT_FALSE(LinuxHost::IsStateOfModule());
  state.Domains().SetLevel("a", "permissive");
  EXPECT_FALSE(StateBase::TakeCommitForModule());
  EXPECT_NO_THROW(LinuxHost::PublishCommitted());
}

TEST_F(ModulePublication, NoCommitIsMadeThatTheStateCannotTellOf) {
  Keep();
  std::filesystem::remove(LinuxHost::PublishedMarkOf(directory.Database()));
  std::filesystem::create_directory(LinuxHost::PublishedMarkOf(directory.Database()));
  EXPECT_THROW(state.Domains().SetLevel("a", "permissive"), LinuxHost::HostError);
  EXPECT_EQ(state.Domains().Get("a").level, "enforcing");
}

TEST_F(ModulePublication, AnEndLeavesNoMark) {
  Keep();
  LinuxHost::EndPublishing();
  EXPECT_FALSE(LinuxHost::IsStateOfModule());
  EXPECT_FALSE(IsPublished());
}

}  // namespace
}  // namespace LinuxHostTest
