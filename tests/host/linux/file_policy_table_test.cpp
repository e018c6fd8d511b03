// File policies of domains and of worlds: batches all or none, updates and removals of exactly one,
// and owners, paths and permissions that do not exist.

#include "host/linux/state/file_policy_table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "child_process.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::FilePolicy;
using LinuxHost::HostState;
using SecPolicyTest::MessageOf;
using ::testing::ElementsAre;

class FilePolicies : public ::testing::Test {
 protected:
  FilePolicy Policy(const std::string& path, unsigned int permission = 1, int world = 0) const {
    return {.domain = {domain, {}}, .world = world, .path = path, .permission = permission};
  }

  void Install(std::vector<FilePolicy> policies) { state.FilePolicies().Install(policies); }

  std::string Refusal(const FilePolicy& policy) {
    return MessageOf([&] { Install({policy}); });
  }

  std::vector<std::string> All() {
    std::vector<std::string> texts;
    for (const auto& policy : state.FilePolicies().All(domain)) {
      const std::string world = policy.world == 0 ? "" : policy.world == self ? " self" : " other";
      texts.push_back(policy.path + " " + Policy::Permissions(policy.permission).Text() + world);
    }
    return texts;
  }

  std::vector<std::string> Shared() {
    std::vector<std::string> paths;
    for (const auto& rule : state.FilePolicies().Read(domain)) paths.push_back(rule.words.front());
    return paths;
  }

  StateDirectory directory;
  HostState& state = HostState::Current();
  unsigned int domain =
      state.Domains().Create("owner", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE, false);
  const int self = getpid();
};

TEST_F(FilePolicies, TellTheDomainsOwnFromThoseOfItsWorlds) {
  Install({Policy("/etc", 1), Policy("/etc", 3, self), Policy("/bin", 0x11)});
  EXPECT_THAT(All(), ElementsAre("/etc r", "/etc rw self", "/bin rx"));
  EXPECT_THAT(Shared(), ElementsAre("/etc", "/bin"));
  EXPECT_EQ(state.FilePolicies().Count(domain), 3U);
}

TEST_F(FilePolicies, ReplaceThoseForTheSamePath) {
  Install({Policy("/etc", 1), Policy("/bin", 0x11)});
  Install({Policy("/etc", 0)});
  EXPECT_THAT(All(), ElementsAre("/bin rx", "/etc "));
}

TEST_F(FilePolicies, AreInstalledAllOrNone) {
  EXPECT_EQ(MessageOf([&] {
              Install({Policy("/etc"), Policy("")});
            }),
            "a file policy needs a path");
  EXPECT_THAT(All(), ElementsAre());
}

TEST_F(FilePolicies, NeedAProperPath) {
  const std::string longest = "/" + std::string(1982, 'p');
  EXPECT_EQ(Refusal(Policy(longest)), "");
  EXPECT_EQ(Refusal(Policy(longest + "p")),
            "path '" + longest + "p' is too long: 1984 bytes, at most 1983");
  EXPECT_EQ(Refusal(Policy(std::string("/a\0b", 4))), "path '/a' goes on after a NUL byte");
}

TEST_F(FilePolicies, NeedADomainAWorldAndPermissionsThatExist) {
  EXPECT_EQ(Refusal(Policy("/etc", 0x4)), "unknown permission bits in 4");
  EXPECT_EQ(Refusal(Policy("/etc", 0x13)), "");
  FilePolicy policy = Policy("/etc");
  policy.domain.id = 77;
  EXPECT_EQ(Refusal(policy), "unknown domain 77");
  EXPECT_EQ(Refusal(Policy("/etc", 1, -3)), "no world has the identifier -3");

  ChildProcess world([] { pause(); });
  EXPECT_EQ(Refusal(Policy("/etc", 1, world.Id())), "");
  world.Kill();
  world.Wait();
  EXPECT_EQ(Refusal(Policy("/etc", 1, world.Id())),
            "no world has the identifier " + std::to_string(world.Id()));
}

TEST_F(FilePolicies, AreRemovedOneByOne) {
  Install({Policy("/etc"), Policy("/etc", 1, self)});
  state.FilePolicies().Remove(domain, 0, "/etc");
  EXPECT_THAT(All(), ElementsAre("/etc r self"));
  EXPECT_EQ(MessageOf([&] { state.FilePolicies().Remove(domain, 0, "/etc"); }),
            "no file policy for '/etc'");
  EXPECT_EQ(MessageOf([&] { state.FilePolicies().Remove(77, 0, "/etc"); }), "unknown domain 77");
}

TEST_F(FilePolicies, CanBeRemovedAfterTheirWorld) {
  ChildProcess world([] { pause(); });
  Install({Policy("/etc", 1, world.Id())});
  world.Kill();
  world.Wait();
  state.FilePolicies().Remove(domain, world.Id(), "/etc");
  EXPECT_THAT(All(), ElementsAre());
}

TEST_F(FilePolicies, AreUpdatedInPlace) {
  Install({Policy("/etc"), Policy("/bin"), Policy("/etc", 1, self)});
  state.FilePolicies().Update(domain, "/etc", 0x13);
  EXPECT_THAT(All(), ElementsAre("/etc rwx", "/bin r", "/etc rwx self"));
  EXPECT_EQ(MessageOf([&] { state.FilePolicies().Update(domain, "/usr", 1); }),
            "no file policy for '/usr'");
  EXPECT_EQ(MessageOf([&] { state.FilePolicies().Update(domain, "/etc", 0x8); }),
            "unknown permission bits in 8");
  EXPECT_EQ(MessageOf([&] { state.FilePolicies().Update(77, "/etc", 1); }), "unknown domain 77");
}

TEST_F(FilePolicies, OfWorldsFollowTheirFile) {
  Install({Policy("/vm/a", 1), Policy("/vm/a", 3, self), Policy("/vm/b", 1, self)});
  state.FilePolicies().RePoint("/vm/a", "/vm/b");
  EXPECT_THAT(All(), ElementsAre("/vm/a r", "/vm/b rw self"));
  EXPECT_EQ(MessageOf([&] { state.FilePolicies().RePoint("/vm/a", "/vm/c"); }),
            "no world has a file policy for '/vm/a'");
  EXPECT_EQ(MessageOf([&] { state.FilePolicies().RePoint("/vm/b", ""); }),
            "a file policy needs a path");
}

}  // namespace
}  // namespace LinuxHostTest
