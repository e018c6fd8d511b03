// Which line of which file a rule or a label came from: the latest one that reaches the path.

#include "host/linux/operation/rule_origins.h"

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
using Policy::Rule;

Rule Call(const std::string& call) {
  return {.kind = Policy::RuleKind::kSyscall, .words = {call}, .verdict = true};
}

RuleOrigin OriginOf(const std::string& domain, const std::string& call, const std::string& file,
                    unsigned int line) {
  Rule rule = Call(call);
  rule.origin = {.file = file, .line = line};
  return {.domain = domain, .rule = rule};
}

// "FILE:LINE" of the rule of the domain for the system call; ":0" when none is recorded.
std::string PlaceOf(const std::string& domain, const std::string& call) {
  std::vector<Rule> rules = {Call("getpid"), Call(call)};
  FindRuleOrigins(HostState::Current(), domain, rules);
  EXPECT_EQ(rules.front().origin.file, "");
  const Policy::Origin& origin = rules.back().origin;
  return origin.file + ":" + std::to_string(origin.line);
}

// The line that labels `path`; 0 when there is none.
unsigned int LineFor(const std::string& path) {
  const auto origin = FindLabelOrigin(HostState::Current(), path);
  return origin ? origin->line : 0;
}

class RuleOriginsTest : public ::testing::Test {
 protected:
  static void RecordRules(const std::vector<RuleOrigin>& rules) {
    RecordOrigins(HostState::Current(), rules, {});
  }
  static void RecordLabels(const std::vector<LabelOrigin>& labels) {
    RecordOrigins(HostState::Current(), {}, labels);
  }

  StateDirectory directory;
};

TEST_F(RuleOriginsTest, AreThoseOfOneDomain) {
  RecordRules({OriginOf("sshDom", "bind", "/p/sshDom", 4),
               OriginOf("appDom", "bind", "/p/appDom", 9),
               OriginOf("sshDom", "listen", "/p/sshDom", 5)});
  EXPECT_EQ(PlaceOf("sshDom", "bind"), "/p/sshDom:4");
  EXPECT_EQ(PlaceOf("sshDom", "listen"), "/p/sshDom:5");
  EXPECT_EQ(PlaceOf("appDom", "bind"), "/p/appDom:9");
  EXPECT_EQ(PlaceOf("appDom", "listen"), ":0");
  EXPECT_EQ(PlaceOf("otherDom", "bind"), ":0");
}

TEST_F(RuleOriginsTest, AreOfExactlyTheRule) {
  RecordRules({OriginOf("sshDom", "bind", "/p/sshDom", 4)});
  Rule revoked = Call("bind");
  revoked.verdict = false;
  Rule capability = Call("bind");
  capability.kind = Policy::RuleKind::kCapability;
  std::vector<Rule> others = {revoked, capability};
  FindRuleOrigins(HostState::Current(), "sshDom", others);
  for (const Rule& rule : others) EXPECT_EQ(rule.origin.file, "") << rule.Text();
}

TEST_F(RuleOriginsTest, KeepWhatElseIsKnownOfTheRule) {
  RecordRules({OriginOf("sshDom", "bind", "/p/sshDom", 4)});
  std::vector<Rule> rules = {Call("bind")};
  rules.front().origin.isGone = true;
  FindRuleOrigins(HostState::Current(), "sshDom", rules);
  EXPECT_EQ(rules.front().origin.line, 4U);
  EXPECT_TRUE(rules.front().origin.isGone);
}

TEST_F(RuleOriginsTest, ALaterOriginOfARuleReplacesTheEarlierOne) {
  RecordRules({OriginOf("sshDom", "bind", "/p/sshDom", 4)});
  RecordRules(
      {OriginOf("sshDom", "bind", "/p/sshDom", 6), OriginOf("sshDom", "bind", "/p/sshDom", 8)});
  EXPECT_EQ(PlaceOf("sshDom", "bind"), "/p/sshDom:8");
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
  const auto origin = FindLabelOrigin(HostState::Current(), "/etc/passwd");
  ASSERT_TRUE(origin.has_value());
  EXPECT_EQ(origin->path, "/etc");
  EXPECT_TRUE(origin->isTree);
  EXPECT_EQ(origin->label, "hostConfig");
  EXPECT_EQ(origin->file, "/p/fileLabels/base");
}

TEST_F(RuleOriginsTest, GoWithABoot) {
  RecordOrigins(HostState::Current(),
                std::vector<RuleOrigin>{OriginOf("sshDom", "bind", "/p/sshDom", 4)},
                std::vector<LabelOrigin>{{"/etc", true, "hostConfig", "/l", 1}});
  HostState::Current().Reset();
  EXPECT_EQ(PlaceOf("sshDom", "bind"), ":0");
  EXPECT_EQ(LineFor("/etc"), 0U);
}

}  // namespace
}  // namespace LinuxHostTest
