// Plans for users who may not read the state: hunts for one that counts after its time, that
// another has made, or that others do not get.
#include "host/linux/operation/published_plans.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <map>
#include <string>

#include "child_process.h"
#include "host/linux/operation/world_entry.h"
#include "host/linux/state/host_state.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

namespace fs = std::filesystem;

using LinuxHost::ArePlansPublished;
using LinuxHost::HostState;
using LinuxHost::PlanFileOf;
using LinuxHost::PlansInTheMaking;
using LinuxHost::ReadPublishedPlan;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;

constexpr char kLoad[] = ". Let root run \"secpolicy load\", which makes a new one";

class PublishedPlans : public ::testing::Test {
 protected:
  static bool Publish(const std::map<std::string, std::string>& plans) {
    return PlansInTheMaking().Publish(plans);
  }

  static mode_t ModeOf(const std::string& path) {
    struct stat status {};
    return lstat(path.c_str(), &status) == 0 ? status.st_mode & 07777 : 0;
  }

  static void Write(const std::string& path, const std::string& content) {
    fs::remove(path);
    std::ofstream(path) << content;
    fs::permissions(path, fs::perms(0644));
  }

  // Changes what the engine has noted of a table or an index.
  void EditSchema(const std::string& change, const std::string& name) {
    state.Database().RunScript("PRAGMA writable_schema = ON; UPDATE sqlite_schema SET " + change +
                               " WHERE name = '" + name + "'");
  }

  // Of the plan of the domain "a".
  std::string Refusal(const std::string& reason) const {
    return "The plan " + directory.Path() + "/plans/a cannot be used: " + reason + kLoad;
  }

  StateDirectory directory;
  HostState& state = HostState::Current();
  const unsigned int domain = state.Domains().Create("a", TESKACCESS_DEFAULT_DOM_NONE, false);
};

TEST_F(PublishedPlans, CountAsLongAsTheStateStaysAsItIs) {
  const std::string none = "There are no plans of the policy as it is in " + directory.Path() +
                           "/plans. Let root run \"secpolicy load\", which makes them";
  EXPECT_EQ(MessageOf([] { LinuxHost::PublishedSerial(); }), none);
  PlansInTheMaking making;
  EXPECT_EQ(MessageOf([] { LinuxHost::PublishedSerial(); }), none);
  ASSERT_TRUE(making.Publish({{"a", "bytes"}}));
  EXPECT_EQ(LinuxHost::PublishedSerial(), making.Serial());
  EXPECT_EQ(ReadPublishedPlan("a"), "bytes");
  state.Domains().SetLevel("a", "disabled");
  EXPECT_EQ(MessageOf([] { LinuxHost::PublishedSerial(); }), none);
}

TEST_F(PublishedPlans, StayWhenAWorldEntersADomain) {
  ASSERT_TRUE(Publish({}));
  LinuxHost::EnterWorld(domain, Policy::Level::kEnforcing);
  EXPECT_TRUE(ArePlansPublished());
}

TEST_F(PublishedPlans, AreNotOfAStateThatHasChangedMeanwhile) {
  PlansInTheMaking making;
  state.Domains().SetLevel("a", "disabled");
  EXPECT_FALSE(making.Publish({{"a", "bytes"}}));
  EXPECT_FALSE(ArePlansPublished());
  EXPECT_FALSE(fs::exists(PlanFileOf("a")));
}

TEST_F(PublishedPlans, AreNotOfAStateThatAnotherProcessHasChangedMeanwhile) {
  PlansInTheMaking making;
  EXPECT_EQ(RunInChild([] { HostState::Current().Domains().SetLevel("a", "permissive"); }), "");
  EXPECT_FALSE(making.Publish({{"a", "bytes"}}));
  EXPECT_FALSE(ArePlansPublished());
}

TEST_F(PublishedPlans, AreOfAStateInWhichAWorldHasEnteredADomainMeanwhile) {
  PlansInTheMaking making;
  LinuxHost::EnterWorld(domain, Policy::Level::kEnforcing);
  EXPECT_TRUE(making.Publish({{"a", "bytes"}}));
  EXPECT_TRUE(ArePlansPublished());
}

TEST_F(PublishedPlans, AreThoseOfWhoHasBegunLast) {
  PlansInTheMaking first;
  PlansInTheMaking last;
  EXPECT_FALSE(first.Publish({{"a", "first"}}));
  EXPECT_TRUE(last.Publish({{"a", "last"}}));
  EXPECT_FALSE(first.Publish({{"a", "first"}}));
  EXPECT_EQ(ReadPublishedPlan("a"), "last");
  EXPECT_TRUE(ArePlansPublished());
}

// Its end takes the mark away of plans that were in the making before.
TEST_F(PublishedPlans, AreMadeBehindACommitThatIsUnderWay) {
  const std::string begun = directory.Path() + "/begun";
  ChildProcess commits([&] {
    HostState& own = HostState::Current();
    LinuxHost::Transaction transaction(own.Database());
    own.Domains().SetLevel("a", "permissive");
    std::ofstream(begun).put('x');
    usleep(50'000);
    transaction.Commit();
  });
  while (!fs::exists(begun)) usleep(1000);
  PlansInTheMaking making;
  EXPECT_EQ(commits.Wait(), "");
  EXPECT_TRUE(making.Publish({{"a", "bytes"}}));
}

TEST_F(PublishedPlans, AreNotOfAStateThatAnotherFileHasReplacedMeanwhile) {
  PlansInTheMaking making;
  const std::string& file = LinuxHost::StatePath();
  fs::rename(file, file + ".aside");
  fs::copy_file(file + ".aside", file);
  EXPECT_FALSE(making.Publish({{"a", "bytes"}}));
  EXPECT_FALSE(ArePlansPublished());
}

TEST_F(PublishedPlans, EndWhenAnotherProcessChangesTheState) {
  ASSERT_TRUE(Publish({{"a", "bytes"}}));
  EXPECT_EQ(RunInChild([] { HostState::Current().Domains().SetLevel("a", "permissive"); }), "");
  EXPECT_FALSE(ArePlansPublished());
}

TEST_F(PublishedPlans, AreOfOneState) {
  ASSERT_TRUE(Publish({}));
  const LinuxHost::UsedState other(directory.Path() + "/other.db");
  HostState::Current();
  EXPECT_FALSE(ArePlansPublished());
}

TEST_F(PublishedPlans, TakeThePlaceOfAllThatWereThere) {
  ASSERT_TRUE(Publish({{"a", "bytes"}, {"b", "of b"}}));
  ASSERT_TRUE(Publish({{"a", "others"}}));
  EXPECT_EQ(ReadPublishedPlan("a"), "others");
  EXPECT_EQ(
      MessageOf([] { ReadPublishedPlan("b"); }),
      "There is no plan of a domain 'b'. Let root run \"secpolicy features --for b\", which "
      "tells whether there is such a domain and what of its rules this kernel cannot keep to");
}

TEST_F(PublishedPlans, AreForAllToReadAndForNobodyToWrite) {
  const mode_t before = umask(0077);
  const bool published = Publish({{"a", "bytes"}});
  umask(before);
  ASSERT_TRUE(published);
  const std::string plans = directory.Path() + "/plans";
  EXPECT_EQ(ModeOf(plans), 0755U);
  for (const char* file : {"/a", "/.current", "/.state"}) EXPECT_EQ(ModeOf(plans + file), 0644U);
  EXPECT_EQ(ModeOf(directory.Path() + "/worlds"), 01777U);
  // Who has chosen the place of the state says who may pass there.
  EXPECT_EQ(ModeOf(directory.Path()), 0700U);
}

TEST_F(PublishedPlans, HaveNamesThatLeadNowhereElse) {
  const std::string plans = directory.Path() + "/plans/";
  EXPECT_EQ(PlanFileOf("appDom"), plans + "appDom");
  EXPECT_EQ(PlanFileOf("../a"), plans + "%2E%2E%2Fa");
  EXPECT_EQ(PlanFileOf(".current"), plans + "%2Ecurrent");
  EXPECT_EQ(PlanFileOf("a b%\n\xff"), plans + "a%20b%25%0A%FF");
  EXPECT_EQ(PlanFileOf("a%20b"), plans + "a%2520b");
  ASSERT_TRUE(Publish({{"../a", "bytes"}, {".state", "more"}, {std::string(63, '/'), "long"}}));
  EXPECT_EQ(ReadPublishedPlan("../a"), "bytes");
  EXPECT_EQ(ReadPublishedPlan(".state"), "more");
  EXPECT_EQ(ReadPublishedPlan(std::string(63, '/')), "long");
}

TEST_F(PublishedPlans, AreNoLinksAndWrittenByTheirOwnerAlone) {
  ASSERT_TRUE(Publish({{"a", "bytes"}}));
  const std::string file = PlanFileOf("a");
  fs::permissions(file, fs::perms(0664));
  EXPECT_EQ(MessageOf([] { ReadPublishedPlan("a"); }), Refusal("other users may write it"));
  fs::permissions(file, fs::perms(0644));
  EXPECT_EQ(ReadPublishedPlan("a"), "bytes");
  fs::rename(file, file + ".aside");
  fs::create_symlink(file + ".aside", file);
  EXPECT_EQ(MessageOf([] { ReadPublishedPlan("a"); }),
            Refusal("Too many levels of symbolic links"));
  fs::remove(file);
  fs::create_directory(file);
  EXPECT_EQ(MessageOf([] { ReadPublishedPlan("a"); }), Refusal("it is no regular file"));
}

TEST_F(PublishedPlans, MayBeEmpty) {
  ASSERT_TRUE(Publish({{"a", ""}}));
  errno = ENOENT;
  EXPECT_EQ(ReadPublishedPlan("a"), "");
}

TEST_F(PublishedPlans, ThatCannotBeWrittenAreTold) {
  ASSERT_TRUE(Publish({{"a", "plan"}}));
  fs::remove(PlanFileOf("a"));
  fs::create_directory(PlanFileOf("a"));
  EXPECT_EQ(MessageOf([] {
              Publish({{"a", "plan"}});
            }),
            "Unable to write " + directory.Path() + "/plans/a: Is a directory");
  EXPECT_FALSE(ArePlansPublished());
}

TEST_F(PublishedPlans, AreNotThoseOfAnotherUser) {
  if (geteuid() != 0) GTEST_SKIP() << "only root can give files away";
  ASSERT_TRUE(Publish({{"a", "bytes"}}));
  ASSERT_EQ(chown(PlanFileOf("a").c_str(), 7, 7), 0);
  EXPECT_EQ(MessageOf([] { ReadPublishedPlan("a"); }), Refusal("it belongs to another user"));
  const std::string plans = directory.Path() + "/plans";
  ASSERT_EQ(chown((plans + "/.current").c_str(), 7, 7), 0);
  EXPECT_FALSE(ArePlansPublished());
  ASSERT_EQ(chown(plans.c_str(), 7, 7), 0);
  EXPECT_EQ(MessageOf([] { Publish({}); }),
            "Unable to use " + plans + ": it belongs to another user. Remove it");
}

TEST_F(PublishedPlans, BringTheStateThatTheyAreOf) {
  state.Domains().SetLevel("a", "disabled");
  ASSERT_TRUE(Publish({}));
  const std::string copy = directory.Path() + "/copy.db";
  LinuxHost::CopyPublishedState(copy);
  const LinuxHost::UsedState used(copy);
  EXPECT_EQ(HostState::Current().Domains().Get("a").level, "disabled");
}

TEST_F(PublishedPlans, AreNotMadeOfDamagedPages) {
  EditSchema("rootpage = (SELECT rootpage FROM sqlite_schema WHERE name = 'role')", "world");
  EXPECT_EQ(MessageOf([] { Publish({}); }),
            "Unable to copy the host state " + directory.Database() + ": it is damaged");
  EXPECT_FALSE(ArePlansPublished());
}

// Who copies the state looks at all of it.
TEST_F(PublishedPlans, BringNoStateWhoseIndexesDoNotFit) {
  state.Database().RunScript(
      "INSERT INTO rule VALUES (1, 0, 'domain transition', 'label', 'a', 'exec', 1, 0, 0)");
  EditSchema("sql = replace(sql, '(word2)', '(word1)')", "transition_target");
  ASSERT_TRUE(Publish({}));
  EXPECT_EQ(MessageOf([&] { LinuxHost::CopyPublishedState(directory.Path() + "/copy.db"); }),
            "Unable to copy the copy " + directory.Path() + "/plans/.state: it is damaged");
}

TEST_F(PublishedPlans, CountForNobodyWhoReadsSomethingElse) {
  ASSERT_TRUE(Publish({}));
  const std::string current = directory.Path() + "/plans/.current";
  std::string said;
  std::getline(std::ifstream(current), said);
  for (const std::string& other :
       {std::string(), std::string(" "), said, said + "\nmore", "8" + said.substr(1) + "0\n"}) {
    Write(current, other);
    EXPECT_FALSE(ArePlansPublished()) << other;
  }
  Write(current, said + "\n");
  EXPECT_TRUE(ArePlansPublished());
}

}  // namespace
}  // namespace LinuxHostTest
