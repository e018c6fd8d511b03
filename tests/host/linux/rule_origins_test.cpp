// Which line of which file a rule or a label came from: the latest one that reaches the path.

#include "host/linux/operation/rule_origins.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/linux/state/host_state.h"
#include "state_directory.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::FindLabelOrigin;
using LinuxHost::FindRuleOrigins;
using LinuxHost::HostState;
using LinuxHost::LabelOrigin;
using LinuxHost::RecordOrigins;
using LinuxHost::RuleOrigin;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

// "RULE from FILE:LINE" of each rule of the domain.
std::vector<std::string> OriginsOf(const std::string& domain) {
  std::vector<std::string> texts;
  for (const RuleOrigin& origin : FindRuleOrigins(domain)) {
    texts.push_back(origin.rule + " from " + origin.file + ":" + std::to_string(origin.line));
  }
  return texts;
}

// The line that labels `path`; 0 when there is none.
unsigned int LineFor(const std::string& path) {
  const auto origin = FindLabelOrigin(path);
  return origin ? origin->line : 0;
}

class RuleOriginsTest : public ::testing::Test {
 protected:
  static void RecordRules(const std::vector<RuleOrigin>& rules) { RecordOrigins(rules, {}); }
  static void RecordLabels(const std::vector<LabelOrigin>& labels) { RecordOrigins({}, labels); }

  StateDirectory directory;
};

TEST_F(RuleOriginsTest, AreThoseOfOneDomain) {
  RecordRules({{"sshDom", "-s bind grant", "/p/sshDom", 4},
               {"appDom", "-s bind grant", "/p/appDom", 9},
               {"sshDom", "-s listen grant", "/p/sshDom", 5}});
  EXPECT_THAT(OriginsOf("sshDom"), UnorderedElementsAre("-s bind grant from /p/sshDom:4",
                                                        "-s listen grant from /p/sshDom:5"));
  EXPECT_THAT(OriginsOf("otherDom"), IsEmpty());
}

TEST_F(RuleOriginsTest, ALaterOriginOfARuleReplacesTheEarlierOne) {
  RecordRules({{"sshDom", "-s bind grant", "/p/sshDom", 4}});
  RecordRules(
      {{"sshDom", "-s bind grant", "/p/sshDom", 6}, {"sshDom", "-s bind grant", "/p/sshDom", 8}});
  EXPECT_THAT(OriginsOf("sshDom"), UnorderedElementsAre("-s bind grant from /p/sshDom:8"));
}

TEST_F(RuleOriginsTest, TheLatestOfThePathAndTheTreesAroundItLabels) {
  RecordLabels({{"/etc", true, "hostConfig", "/l", 1},
                {"/etc/ssh", true, "sshKey", "/l", 2},
                {"/etc/ssh/config", false, "hostConfig", "/l", 3}});
  EXPECT_EQ(LineFor("/etc"), 1U);
  EXPECT_EQ(LineFor("/etc/passwd"), 1U);
  EXPECT_EQ(LineFor("/etc/ssh"), 2U);
  EXPECT_EQ(LineFor("/etc/ssh/deep/er"), 2U);
  EXPECT_EQ(LineFor("/etc/ssh/config"), 3U);
  EXPECT_EQ(LineFor("/etc2"), 0U);
  EXPECT_EQ(LineFor("/usr"), 0U);

  RecordLabels({{"/etc", true, "hostConfig", "/l", 7}});
  EXPECT_EQ(LineFor("/etc/ssh/config"), 7U);
}

TEST_F(RuleOriginsTest, ALabelOfOneFileIsNotOneOfATree) {
  RecordLabels({{"/etc", false, "hostConfig", "/l", 1}});
  EXPECT_EQ(LineFor("/etc"), 1U);
  EXPECT_EQ(LineFor("/etc/passwd"), 0U);
}

TEST_F(RuleOriginsTest, TheTreeOfEverythingReachesEveryPath) {
  RecordLabels({{"", true, "hostConfig", "/l", 1}});
  EXPECT_EQ(LineFor("/etc/passwd"), 1U);
  EXPECT_EQ(LineFor("/"), 1U);
}

TEST_F(RuleOriginsTest, TellsLabelAndFile) {
  RecordLabels({{"/etc", true, "hostConfig", "/p/fileLabels/base", 3}});
  const auto origin = FindLabelOrigin("/etc/passwd");
  ASSERT_TRUE(origin.has_value());
  EXPECT_EQ(origin->path, "/etc");
  EXPECT_TRUE(origin->isTree);
  EXPECT_EQ(origin->label, "hostConfig");
  EXPECT_EQ(origin->file, "/p/fileLabels/base");
}

TEST_F(RuleOriginsTest, GoWithABoot) {
  RecordOrigins(std::vector<RuleOrigin>{{"sshDom", "-s bind grant", "/p/sshDom", 4}},
                std::vector<LabelOrigin>{{"/etc", true, "hostConfig", "/l", 1}});
  HostState::Current().Reset();
  EXPECT_THAT(OriginsOf("sshDom"), IsEmpty());
  EXPECT_EQ(LineFor("/etc"), 0U);
}

}  // namespace
}  // namespace LinuxHostTest
