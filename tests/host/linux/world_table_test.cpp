// Worlds in domains: gone with their process, and never taken for a later one of the same number.

#include "host/linux/state/world_table.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include "child_process.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using SecPolicyTest::MessageOf;

class Worlds : public ::testing::Test {
 protected:
  StateDirectory directory;
  HostState& state = HostState::Current();
  unsigned int domain =
      state.Domains().Create("a", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE, false);
};

TEST_F(Worlds, RunInTheStartDomainUntilTheyArePlaced) {
  EXPECT_EQ(state.Worlds().DomainOf(getpid()), LinuxHost::kStartDomain);
  state.Worlds().Place(getpid(), domain);
  EXPECT_EQ(state.Worlds().DomainOf(getpid()), domain);
  EXPECT_EQ(state.Worlds().CountIn(domain), 1U);
  state.Worlds().Place(getpid(), LinuxHost::kStartDomain);
  EXPECT_EQ(state.Worlds().CountIn(domain), 0U);
}

TEST_F(Worlds, AreGoneWhenTheirProcessIs) {
  ChildProcess world([] { pause(); });
  state.Worlds().Place(world.Id(), domain);
  EXPECT_EQ(state.Worlds().CountIn(domain), 1U);
  world.Kill();
  world.Wait();
  EXPECT_EQ(state.Worlds().CountIn(domain), 0U);
  EXPECT_EQ(MessageOf([&] { state.Worlds().DomainOf(world.Id()); }),
            "no world has the identifier " + std::to_string(world.Id()));
}

TEST_F(Worlds, AreNotTakenForLaterOnesWithTheSameNumber) {
  state.Worlds().Place(getpid(), domain);
  state.Database().Run("UPDATE world SET started = started - 1");
  EXPECT_EQ(state.Worlds().DomainOf(getpid()), LinuxHost::kStartDomain);
  EXPECT_EQ(state.Worlds().CountIn(domain), 0U);
}

TEST_F(Worlds, HavePositiveNumbers) {
  EXPECT_EQ(MessageOf([&] { state.Worlds().DomainOf(0); }), "no world has the identifier 0");
  EXPECT_EQ(MessageOf([&] { state.Worlds().DomainOf(-1); }), "no world has the identifier -1");
}

TEST_F(Worlds, ArePlacedInDomainsThatExist) {
  EXPECT_EQ(MessageOf([&] { state.Worlds().Place(getpid(), 77); }), "unknown domain 77");
}

}  // namespace
}  // namespace LinuxHostTest
