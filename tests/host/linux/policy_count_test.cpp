// The count of what is installed, where policies of worlds are none of the rules.

#include "host/linux/operation/policy_count.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include "host/linux/state/file_policy_table.h"
#include "host/linux/state/host_state.h"
#include "state_directory.h"
#include "teskctl/security.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::CountPolicy;
using LinuxHost::FilePolicy;

class PolicyCounts : public ::testing::Test {
 protected:
  unsigned int Create() {
    return access.CreateDomain("owner", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
  }

  StateDirectory directory;
  TeskCtl::Security::TeskAccessInterfaceImpl access;
};

TEST_F(PolicyCounts, BeginWithWhatIsBuiltIn) {
  EXPECT_EQ(CountPolicy(LinuxHost::HostState::Current()).domains, 1U);
  EXPECT_EQ(CountPolicy(LinuxHost::HostState::Current()).rules, 0U);
  EXPECT_EQ(CountPolicy(LinuxHost::HostState::Current()).objects, 2U);
}

TEST_F(PolicyCounts, AddUpRulesOfAllTables) {
  const unsigned int id = Create();
  access.AddLabels({"thing"}, TeskCtl::Security::TESKACCESS_LABEL_OBJECT);
  access.SetSyscallRule({1, id, "owner", "read", true});
  access.SetCapabilityParamRule({2, id, "owner", "bind_port", "80", "", true});
  const FilePolicy policy = {.domain = {id, "owner"}, .path = "/etc", .permission = 1};
  LinuxHost::HostState::Current().FilePolicies().Install({&policy, 1});
  EXPECT_EQ(CountPolicy(LinuxHost::HostState::Current()).domains, 2U);
  EXPECT_EQ(CountPolicy(LinuxHost::HostState::Current()).rules, 3U);
  EXPECT_EQ(CountPolicy(LinuxHost::HostState::Current()).objects, 3U);
}

TEST_F(PolicyCounts, LeaveOutThePoliciesOfWorlds) {
  const FilePolicy policy = {
      .domain = {Create(), "owner"}, .world = getpid(), .path = "/etc", .permission = 1};
  LinuxHost::HostState::Current().FilePolicies().Install({&policy, 1});
  EXPECT_EQ(CountPolicy(LinuxHost::HostState::Current()).rules, 0U);
}

}  // namespace
}  // namespace LinuxHostTest
