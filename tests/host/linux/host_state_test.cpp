// The state behind the tables: where it lies, what it starts with, who has it open, and what is
// left after a reset.

#include "host/linux/state/host_state.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <thread>
#include <vector>

#include "braxo/misc/strcat.h"
#include "child_process.h"
#include "host/linux/common/inode_origin.h"
#include "host/linux/state/schema.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

using Braxo::Misc::StrCat;
using LinuxHost::HostState;
using LinuxHost::InodeOrigin;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using ::testing::ElementsAre;
using ::testing::Pair;

InodeOrigin OriginOf(dev_t device, ino_t inode, const std::string& tardisk) {
  InodeOrigin origin;
  origin.device = device;
  origin.inode = inode;
  origin.tardisk = tardisk;
  return origin;
}

// Empty for an inode that came from no tardisk.
std::string TardiskOf(dev_t device, ino_t inode) {
  const auto origin = HostState::Current().FindOrigin(device, inode);
  return origin ? origin->tardisk : std::string();
}

std::vector<std::string> UnpackedFiles() {
  std::vector<std::string> files;
  HostState::Current().ForEachUnpackedFile([&files](const LinuxHost::UnpackedFile& file) {
    files.push_back(StrCat(file.device, " ", file.inode, " ", file.generation, " ", file.tardisk));
  });
  return files;
}

class HostStateFile : public ::testing::Test {
 protected:
  StateDirectory directory;
};

TEST_F(HostStateFile, LiesWhereItIsUsed) {
  EXPECT_EQ(HostState::Current().Database().Path(), directory.Database());
  EXPECT_TRUE(std::filesystem::exists(directory.Database()));
}

// In a child without a state of the test's own, which tells what it finds as its failure.
TEST(HostStatePath, IsThatOfTheEnvironmentAtTheFirstUse) {
  EXPECT_EQ(RunInChild([] {
              setenv("SECPOLICY_HOST_STATE", "/first/host.db", 1);
              const std::string first = LinuxHost::StatePath();
              setenv("SECPOLICY_HOST_STATE", "/second/host.db", 1);
              throw std::runtime_error(first + " " + LinuxHost::StatePath());
            }),
            "/first/host.db /first/host.db");
}

TEST(HostStatePath, IsThatOfTheLatestUse) {
  EXPECT_EQ(RunInChild([] {
              setenv("SECPOLICY_HOST_STATE", "/given/host.db", 1);
              const LinuxHost::UsedState outer("/outer/host.db");
              std::string paths;
              {
                const LinuxHost::UsedState inner("/inner/host.db");
                paths = LinuxHost::StatePath() + " ";
              }
              throw std::runtime_error(paths + LinuxHost::StatePath());
            }),
            "/inner/host.db /outer/host.db");
}

TEST_F(HostStateFile, StartsWithTheBuiltInContents) {
  HostState& state = HostState::Current();
  EXPECT_EQ(state.Domains().Get("hostDom").id, 0U);
  EXPECT_EQ(state.Domains().Get("hostDom").level, "permissive");
  EXPECT_THAT(state.Labels().All(), ElementsAre(Pair("tardiskDefault", 3), Pair("unlabeled", 2)));
  EXPECT_EQ(state.LabelAttribute(), "");
}

TEST_F(HostStateFile, StaysOpenFromCallToCall) {
  const HostState* first = &HostState::Current();
  EXPECT_EQ(&HostState::Current(), first);
}

TEST_F(HostStateFile, FollowsItsUseToAnotherPlace) {
  HostState::Current().Domains().Create("tool", TESKACCESS_DEFAULT_DOM_NONE, false);
  const std::string other = directory.Path() + "/other.db";
  {
    const LinuxHost::UsedState used(other);
    EXPECT_EQ(HostState::Current().Domains().Find("tool"), nullptr);
    EXPECT_EQ(HostState::Current().Database().Path(), other);
  }
  EXPECT_NE(HostState::Current().Domains().Find("tool"), nullptr);
}

TEST_F(HostStateFile, StartsAnewWhenTheFileIsGone) {
  HostState::Current().Domains().Create("tool", TESKACCESS_DEFAULT_DOM_NONE, false);
  for (const char* suffix : {"", "-wal", "-shm"}) {
    std::filesystem::remove(directory.Database() + suffix);
  }
  EXPECT_EQ(HostState::Current().Domains().Find("tool"), nullptr);
}

TEST_F(HostStateFile, IsOpenedAgainInAForkedChild) {
  HostState::Current().Domains().Create("tool", TESKACCESS_DEFAULT_DOM_NONE, false);
  EXPECT_EQ(RunInChild([] {
              HostState::Current().Domains().Create("child", TESKACCESS_DEFAULT_DOM_NONE, false);
            }),
            "");
  HostState::Current().Refresh();
  EXPECT_NE(HostState::Current().Domains().Find("child"), nullptr);
}

TEST_F(HostStateFile, IsOpenedByEachThread) {
  HostState* other = nullptr;
  std::thread([&] {
    other = &HostState::Current();
    other->Domains().Create("thread", TESKACCESS_DEFAULT_DOM_NONE, false);
  }).join();
  EXPECT_NE(other, &HostState::Current());
  EXPECT_NE(HostState::Current().Domains().Find("thread"), nullptr);
}

TEST_F(HostStateFile, SaysWhatToDoAboutAForeignFile) {
  directory.Write("host.db", "# this is my diary, not a database\n");
  std::filesystem::permissions(directory.Database(), std::filesystem::perms(0600));
  EXPECT_EQ(MessageOf([] { HostState::Current(); }),
            "Unable to use the host state " + directory.Database() +
                ": it is damaged or no such thing (file is not a database). Remove the file and "
                "run \"secpolicy boot\", which makes a new one");
}

TEST_F(HostStateFile, GoesBackToTheBuiltInContents) {
  HostState& state = HostState::Current();
  const unsigned int id = state.Domains().Create("tool", TESKACCESS_DEFAULT_DOM_NONE, true);
  state.Labels().Add({"toolLabel"});
  state.Domains().SetRole(LinuxHost::DomainRole::GlobalVm, id);
  state.Domains().AddGuestService(id, "clipboard");
  state.Rules().Install({id, "tool"},
                        {.kind = Policy::RuleKind::kSyscall, .words = {"read"}, .verdict = true});
  state.ParameterRules().Install(
      {id, "tool"},
      {.kind = Policy::RuleKind::kParameterCheck, .words = {"bind_port", "80"}, .verdict = true});
  const LinuxHost::FilePolicy policy = {.domain = {id, "tool"}, .path = "/etc", .permission = 1};
  state.FilePolicies().Install({&policy, 1});
  state.Worlds().Place(getpid(), id);
  const InodeOrigin origin = OriginOf(7, 8, "base.tgz");
  state.RecordOrigins({&origin, 1});
  state.ChooseLabelAttribute("user.zorvan.security");

  state.Reset();

  EXPECT_THAT(state.Labels().All(), ElementsAre(Pair("tardiskDefault", 3), Pair("unlabeled", 2)));
  EXPECT_EQ(state.Domains().Find("tool"), nullptr);
  EXPECT_EQ(state.LabelAttribute(), "");
  EXPECT_EQ(TardiskOf(7, 8), "");
  EXPECT_EQ(state.Worlds().DomainOf(getpid()), LinuxHost::kStartDomain);
  // A new domain in the same slot finds nothing of the old one.
  EXPECT_EQ(state.Domains().Create("next", TESKACCESS_DEFAULT_DOM_NONE, false), id);
  EXPECT_EQ(state.Domains().CountReferences(state.Domains().Get(id)).Sum(), 0U);
  EXPECT_THAT(state.Domains().GuestServices(id), ElementsAre());
  EXPECT_TRUE(state.Rules().Read(id, Policy::RuleKind::kSyscall).empty());
  EXPECT_TRUE(state.ParameterRules().Read(id).empty());
  EXPECT_EQ(state.FilePolicies().Count(id), 0U);
  state.Labels().Add({"first"});
  state.Refresh();
  EXPECT_EQ(state.Labels().Lookup("first"), 5U);
}

// What is not listed would outlive a boot.
TEST_F(HostStateFile, ListsEveryTableThatItHas) {
  std::vector<std::string> listed = {"sqlite_sequence", "state"};
  for (const auto& table : LinuxHost::kStateTables) listed.emplace_back(table.name);
  std::vector<std::string> there;
  auto rows =
      HostState::Current().Database().Select("SELECT name FROM sqlite_schema WHERE type = 'table'");
  while (rows.Next()) there.push_back(rows.Text(0));
  EXPECT_THAT(there, ::testing::UnorderedElementsAreArray(listed));
}

// What is of a domain and not marked so would be the next one's in its slot.
TEST_F(HostStateFile, KnowsWhatIsOfDomains) {
  for (const auto& table : LinuxHost::kStateTables) {
    const bool hasDomain = HostState::Current().Database().ReadInteger(
                               std::string("SELECT count(*) FROM pragma_table_info('") +
                               table.name + "') WHERE name = 'domain_id'") != 0;
    // No domain that plays a part can go.
    EXPECT_EQ(table.isOfDomains, hasDomain && std::string(table.name) != "role") << table.name;
  }
}

TEST_F(HostStateFile, ResetsForOtherProcessesToo) {
  HostState& state = HostState::Current();
  state.Domains().Create("tool", TESKACCESS_DEFAULT_DOM_NONE, false);
  ASSERT_EQ(RunInChild([] { HostState::Current().Reset(); }), "");
  state.Refresh();
  EXPECT_EQ(state.Domains().Find("tool"), nullptr);
}

TEST_F(HostStateFile, RemembersWhereInodesCameFrom) {
  HostState& state = HostState::Current();
  const std::vector<InodeOrigin> origins = {OriginOf(1, 10, "base.tgz"),
                                            OriginOf(1, 11, "tool.tgz")};
  state.RecordOrigins(origins);
  EXPECT_EQ(TardiskOf(1, 10), "base.tgz");
  EXPECT_EQ(TardiskOf(1, 11), "tool.tgz");
  EXPECT_EQ(TardiskOf(2, 10), "");
  EXPECT_EQ(TardiskOf(1, 12), "");

  const InodeOrigin later = OriginOf(1, 10, "patch.tgz");
  state.RecordOrigins({&later, 1});
  EXPECT_EQ(TardiskOf(1, 10), "patch.tgz");
}

TEST_F(HostStateFile, ListsTheFilesThatAKernelCanTell) {
  HostState& state = HostState::Current();
  std::vector<InodeOrigin> origins = {OriginOf(1, 10, "base.tgz"), OriginOf(1, 11, "tool.tgz"),
                                      OriginOf(1, 12, "base.tgz"), OriginOf(1, 13, "base.tgz")};
  origins[1].generation = ~std::uint32_t{0};
  origins[2].generation = 0;
  origins[3].generation = 5;
  state.RecordOrigins(origins);
  EXPECT_THAT(UnpackedFiles(),
              ElementsAre("1 11 4294967295 tool.tgz", "1 12 0 base.tgz", "1 13 5 base.tgz"));

  origins[1].tardisk = "patch.tgz";
  origins[2].generation.reset();
  state.RecordOrigins(origins);
  EXPECT_THAT(UnpackedFiles(), ElementsAre("1 11 4294967295 patch.tgz", "1 13 5 base.tgz"));
  state.Reset();
  EXPECT_THAT(UnpackedFiles(), ElementsAre());
}

TEST_F(HostStateFile, TakesTheGreatestInodeNumber) {
  const InodeOrigin origin = OriginOf(~dev_t{0}, ~ino_t{0}, "base.tgz");
  HostState::Current().RecordOrigins({&origin, 1});
  EXPECT_EQ(TardiskOf(~dev_t{0}, ~ino_t{0}), "base.tgz");
}

TEST_F(HostStateFile, KeepsTheFirstChoiceOfAnAttribute) {
  HostState& state = HostState::Current();
  EXPECT_EQ(state.ChooseLabelAttribute("security.bpf.zorvan"), "security.bpf.zorvan");
  EXPECT_EQ(state.ChooseLabelAttribute("user.zorvan.security"), "security.bpf.zorvan");
  EXPECT_EQ(state.LabelAttribute(), "security.bpf.zorvan");
  EXPECT_EQ(RunInChild([] {
              if (HostState::Current().LabelAttribute() != "security.bpf.zorvan")
                throw std::runtime_error("another");
            }),
            "");
}

}  // namespace
}  // namespace LinuxHostTest
