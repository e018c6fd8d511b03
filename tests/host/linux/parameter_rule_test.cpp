// Parameter rules: which of them conflict, that the quick search for conflicts misses none, and
// removals of exactly one range.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/parameter_rule_table.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TeskAccess_CapabilityParamRule;
using ::testing::ElementsAre;

// ---- Conflicts.

using ParameterRules = std::list<TeskAccess_CapabilityParamRule>;

TeskAccess_CapabilityParamRule ParameterRuleOf(unsigned int line, const std::string& first,
                                               const std::string& last, bool grant,
                                               const std::string& check = "bind_port") {
  return {line, 0, "owner", check, first, last, grant};
}

std::string Conflict(const ParameterRules& rules) {
  return MessageOf([&] { LinuxHost::RequireNoConflict(rules); });
}

TEST(ParameterRuleConflict, IsAnOverlapOfGrantAndRevoke) {
  EXPECT_EQ(
      Conflict({ParameterRuleOf(1, "80", "443", true), ParameterRuleOf(2, "443", "", false)}),
      "parameter check 'bind_port': grant of 80 to 443 in line 1 conflicts with revoke of 443 "
      "in line 2");
  EXPECT_EQ(Conflict({ParameterRuleOf(1, "5", "", false), ParameterRuleOf(2, "0x5", "", true)}),
            "parameter check 'bind_port': revoke of 5 in line 1 conflicts with grant of 0x5 in "
            "line 2");
  EXPECT_EQ(
      Conflict({ParameterRuleOf(1, "50", "60", false), ParameterRuleOf(2, "1", "99", true)}),
      "parameter check 'bind_port': revoke of 50 to 60 in line 1 conflicts with grant of 1 to "
      "99 in line 2");
}

// Services install rules that are in no line.
TEST(ParameterRuleConflict, IsToldInTheOrderOfTheValuesWhereLinesAreTheSame) {
  EXPECT_EQ(Conflict({ParameterRuleOf(0, "7", "", false), ParameterRuleOf(0, "1", "9", true)}),
            "parameter check 'bind_port': grant of 1 to 9 in line 0 conflicts with revoke of 7 in "
            "line 0");
}

// Two values would be a range, and a mask has none.
TEST(ParameterRuleConflict, IsASecondValueOfAMask) {
  EXPECT_EQ(Conflict({ParameterRuleOf(1, "0x100", "0x200", true, "clone_flags")}),
            "parameter check 'clone_flags' takes one value, of all bits that it is about");
  EXPECT_EQ(Conflict({ParameterRuleOf(1, "0x300", "", true, "clone_flags")}), "");
}

TEST(ParameterRuleConflict, IsNoOverlapOfTheSameVerdict) {
  EXPECT_EQ(Conflict({ParameterRuleOf(1, "1", "9", true), ParameterRuleOf(2, "5", "20", true)}),
            "");
}

TEST(ParameterRuleConflict, IsNotBetweenNeighbours) {
  EXPECT_EQ(Conflict({ParameterRuleOf(1, "1", "9", true), ParameterRuleOf(2, "10", "20", false),
                      ParameterRuleOf(3, "21", "30", true)}),
            "");
}

TEST(ParameterRuleConflict, IsNotBetweenDifferentChecks) {
  EXPECT_EQ(Conflict({ParameterRuleOf(1, "1", "9", true),
                      ParameterRuleOf(2, "1", "9", false, "connect_port")}),
            "");
}

TEST(ParameterRuleConflict, IsFoundBehindALongRange) {
  EXPECT_EQ(
      Conflict({ParameterRuleOf(1, "1", "1000", true), ParameterRuleOf(2, "2", "3", true),
                ParameterRuleOf(3, "500", "", false)}),
      "parameter check 'bind_port': grant of 1 to 1000 in line 1 conflicts with revoke of 500 "
      "in line 3");
}

TEST(ParameterRuleConflict, AgreesWithComparingEachPair) {
  std::uint64_t seed = 1;
  const auto random = [&](std::uint64_t limit) {
    seed = seed * 6364136223846793005U + 1442695040888963407U;
    return (seed >> 33U) % limit;
  };
  int conflicts = 0;
  for (int round = 0; round < 2000; ++round) {
    ParameterRules rules;
    for (unsigned int line = 1; line <= 4; ++line) {
      const auto first = random(30);
      rules.push_back(ParameterRuleOf(line, std::to_string(first),
                                      std::to_string(first + random(6)), random(2) == 0));
    }
    bool expected = false;
    for (const auto& left : rules) {
      for (const auto& right : rules) {
        expected = expected || (left.grant != right.grant &&
                                std::stoul(left.firstParam) <= std::stoul(right.secondParam) &&
                                std::stoul(right.firstParam) <= std::stoul(left.secondParam));
      }
    }
    ASSERT_EQ(!Conflict(rules).empty(), expected);
    conflicts += expected ? 1 : 0;
  }
  EXPECT_GT(conflicts, 200);
  EXPECT_LT(conflicts, 1800);
}

TEST(ParameterRuleConflict, NamesARangeThatCannotBeRead) {
  EXPECT_EQ(Conflict({ParameterRuleOf(1, "many", "", true)}),
            "parameter 'many' is not an unsigned number");
}

// ---- The table.

class InstalledParameterRules : public ::testing::Test {
 protected:
  void Install(const std::string& first, const std::string& last, bool granted,
               const std::string& check = "bind_port") {
    const Policy::Rule rule = {.kind = Policy::RuleKind::kParameterCheck,
                               .words = {check, first, last},
                               .verdict = granted,
                               .line = 1};
    state.ParameterRules().Install({domain, "owner"}, rule);
  }

  std::vector<std::string> All() {
    std::vector<std::string> texts;
    for (const Policy::Rule& rule : state.ParameterRules().Read(domain)) {
      texts.push_back(rule.Text());
    }
    return texts;
  }

  StateDirectory directory;
  HostState& state = HostState::Current();
  unsigned int domain =
      state.Domains().Create("owner", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE, false);
};

TEST_F(InstalledParameterRules, AreTheSameHoweverTheirNumbersAreWritten) {
  Install("80", "443", true);
  Install("7", "", true);
  Install("0x50", "0x1bb", false);
  Install("7", "7", true);
  EXPECT_THAT(All(), ElementsAre("-p bind_port 0x50 0x1bb revoke", "-p bind_port 7 7 grant"));
}

TEST_F(InstalledParameterRules, HoldTheGreatestNumber) {
  Install("0", "18446744073709551615", true);
  state.ParameterRules().Remove(domain, "bind_port", {0, ~std::uint64_t{0}});
  EXPECT_THAT(All(), ElementsAre());
}

TEST_F(InstalledParameterRules, AreRemovedByExactlyTheirRange) {
  Install("80", "443", true);
  EXPECT_EQ(MessageOf([&] {
              state.ParameterRules().Remove(domain, "bind_port", {80, 80});
            }),
            "no rule for parameter check 'bind_port'");
  EXPECT_EQ(MessageOf([&] {
              state.ParameterRules().Remove(domain, "set_uid", {80, 443});
            }),
            "no rule for parameter check 'set_uid'");
  EXPECT_EQ(MessageOf([&] { state.ParameterRules().Remove(domain, "bind_port", {80, 443}); }), "");
  EXPECT_THAT(All(), ElementsAre());
}

TEST_F(InstalledParameterRules, MustUseADomainAndACheckThatExist) {
  EXPECT_EQ(MessageOf([&] { Install("1", "", true, "shoe_size"); }),
            "unknown parameter check 'shoe_size'");
  domain = 77;
  EXPECT_EQ(MessageOf([&] { Install("1", "", true); }), "unknown domain 77");
  EXPECT_EQ(MessageOf([&] {
              state.ParameterRules().Remove(77, "bind_port", {1, 1});
            }),
            "unknown domain 77");
}

}  // namespace
}  // namespace LinuxHostTest
