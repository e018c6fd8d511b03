// A policy file that is opened as descriptor 0 and taken for unopened.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "secpolicy/secpolicy.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

// Programs that are started without standard input get the descriptor 0 for their first file.
class WithoutStandardInput {
 public:
  WithoutStandardInput() : kept(fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3)) { close(STDIN_FILENO); }
  WithoutStandardInput(const WithoutStandardInput&) = delete;
  WithoutStandardInput& operator=(const WithoutStandardInput&) = delete;
  ~WithoutStandardInput() {
    dup2(kept, STDIN_FILENO);
    close(kept);
  }

 private:
  int kept;
};

TEST(TardiskPolicyGetBackingTardiskPath, WorksWithoutStandardInput) {
  ScriptedHost host;
  const PolicyTree tree({{"policy", ""}});
  host.SetTardisk(tree / "policy", "tool.tgz");
  SecPolicy::TardiskPolicy policy(tree / "policy");
  const WithoutStandardInput without;

  EXPECT_EQ(policy.GetBackingTardiskPath(), "/tardisks/tool.tgz");

  EXPECT_EQ(fcntl(STDIN_FILENO, F_GETFD), -1) << "the policy file was left open";
}

}  // namespace
}  // namespace SecPolicyTest
