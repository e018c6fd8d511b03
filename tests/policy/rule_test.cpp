// Rules and the contract's records: hunts for words that change their place, and for a text that
// is not the one that the library shows.

#include "policy/rule.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <list>

#include "domain/rule_families.h"

namespace PolicyTest {
namespace {

using Policy::Rule;
using Policy::RuleKind;
using SecPolicyTest::InstalledRules;

// The only list of `rules` that holds any, made into rules and back into records.
template <class Record>
void Convert(std::list<Record>& records, std::vector<Rule>& rules) {
  for (Record& record : records) {
    rules.push_back(Policy::TakeRule(record));
    Rule rule = rules.back();
    Policy::MoveInto(record, rule);
  }
}

std::vector<Rule> ThereAndBack(InstalledRules& records) {
  std::vector<Rule> rules;
  Convert(records.filePathAccess, rules);
  Convert(records.syscall, rules);
  Convert(records.capability, rules);
  Convert(records.capabilityParam, rules);
  Convert(records.objectAccess, rules);
  Convert(records.domTrans, rules);
  Convert(records.fileCreation, rules);
  Convert(records.unixSockCreation, rules);
  return rules;
}

class RuleRecord : public testing::TestWithParam<SecPolicyTest::RuleFamily> {
 protected:
  // What the family's rule set of the library prints of the records.
  std::string Printed(const InstalledRules& records) {
    SecPolicyTest::ScriptedHost host;
    host.rules[42] = records;
    TeskCtl::Security::TeskAccessInterfaceImpl access;
    const auto rules = GetParam().make();
    rules->keyword = GetParam().keyword;
    rules->ReadSystemRules(42, access);
    rules->PrintRules();
    return host.StandardOutput();
  }
};
INSTANTIATE_TEST_SUITE_P(Families, RuleRecord, testing::ValuesIn(SecPolicyTest::AllFamilies()),
                         [](const auto& family) { return std::string(family.param.name); });

TEST_P(RuleRecord, IsShownAsTheLibraryShowsIt) {
  InstalledRules records;
  GetParam().install(records);
  std::string texts;
  for (const Rule& rule : ThereAndBack(records)) texts += rule.Text() + "\n";
  EXPECT_EQ(texts + "\n\n", Printed(records));
}

TEST_P(RuleRecord, StaysAsItIsThereAndBack) {
  InstalledRules records;
  GetParam().install(records);
  const std::string before = Printed(records);
  const std::vector<Rule> rules = ThereAndBack(records);
  EXPECT_EQ(Printed(records), before);
  ASSERT_EQ(rules.size(), 2U);
  for (const Rule& rule : rules) {
    EXPECT_EQ(rule.line, 7U);
    EXPECT_STREQ(FormOf(rule.kind).keyword, GetParam().keyword);
  }
  EXPECT_TRUE(rules.front().Grants());
  EXPECT_FALSE(rules.back().Grants());
}

TEST(RuleRecord, TakesTheLineButNoDomain) {
  Rule rule = {.kind = RuleKind::kSyscall, .words = {"read"}, .verdict = true, .line = 9};
  TeskCtl::Security::TeskAccess_SyscallRule record = {1, 42, "appDom", "write", false};
  Policy::MoveInto(record, rule);
  EXPECT_EQ(record.line, 9U);
  EXPECT_EQ(record.domainId, 42U);
  EXPECT_EQ(record.domainName, "appDom");
  EXPECT_EQ(record.syscall, "read");
  EXPECT_TRUE(record.grant);
}

TEST(RuleRecord, HasNoWordForARangeOfOneValue) {
  TeskCtl::Security::TeskAccess_CapabilityParamRule record = {7,      42, "appDom", "bind_port",
                                                              "0x50", "", true};
  const Rule rule = Policy::TakeRule(record);
  EXPECT_THAT(rule.Words(), testing::ElementsAre("bind_port", "0x50"));
  EXPECT_EQ(rule.Text(), "-p bind_port 0x50 grant");
  EXPECT_EQ(rule.Range().first, 80U);
  EXPECT_EQ(rule.Range().last, 80U);
}

TEST(RuleRecord, KeepsEmptyWordsOfOtherKinds) {
  TeskCtl::Security::TeskAccess_ObjectAccessRule record = {7, 42, "appDom", "a", "", true};
  EXPECT_THAT(Policy::TakeRule(record).Words(), testing::ElementsAre("a", ""));
}

TEST(Rule, SaysWhatItDecides) {
  const std::pair<Rule, const char*> texts[] = {
      {{.kind = RuleKind::kObjectAccess, .words = {"sshKey", "read"}, .verdict = true},
       "-a sshKey read grant"},
      {{.kind = RuleKind::kParameterCheck, .words = {"bind_port", "1", "0x50"}, .verdict = false},
       "-p bind_port 1 0x50 revoke"},
      {{.kind = RuleKind::kFilePath, .words = {"/a b"}, .verdict = Policy::Permissions(0x11)},
       "-r /a b rx"},
      {{.kind = RuleKind::kFilePath, .words = {"/"}, .verdict = Policy::Permissions()}, "-r / "},
  };
  for (const auto& [rule, text] : texts) EXPECT_EQ(rule.Text(), text);
}

TEST(Rule, HasTheRangeOfItsWords) {
  const Rule rule = {
      .kind = RuleKind::kParameterCheck, .words = {"bind_port", "1", "0x50"}, .verdict = false};
  EXPECT_EQ(rule.Range().first, 1U);
  EXPECT_EQ(rule.Range().last, 80U);
}

}  // namespace
}  // namespace PolicyTest
