// Rules with domains or words that do not exist, also when another process has just made or
// removed them.

#include "host/linux/state/rule_table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <tuple>
#include <vector>

#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/label_table.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::DomainReference;
using LinuxHost::HostState;
using Policy::Rule;
using Policy::RuleKind;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using ::testing::ElementsAre;

using Words = decltype(Rule::words);

class RulesOfWords : public ::testing::Test {
 protected:
  static Rule ObjectAccess(const std::string& label, const std::string& kind = "read") {
    return {.kind = RuleKind::kObjectAccess, .words = {label, kind}, .verdict = true, .line = 1};
  }

  void Install(const Rule& rule) { state.Rules().Install({domain, "owner"}, rule); }

  std::string Refusal(const Rule& rule, const DomainReference& of, unsigned int targetId = 0) {
    return MessageOf([&] { state.Rules().Install(of, rule, targetId); });
  }
  std::string Refusal(const Rule& rule) { return Refusal(rule, {domain, "owner"}); }

  std::vector<std::string> Labels(RuleKind kind = RuleKind::kObjectAccess) {
    std::vector<std::string> labels;
    for (const Rule& rule : state.Rules().Read(domain, kind)) labels.push_back(rule.words.front());
    return labels;
  }

  StateDirectory directory;
  HostState& state = HostState::Current();
  unsigned int domain = state.Domains().Create("owner", TESKACCESS_DEFAULT_DOM_NONE, false);
};

TEST_F(RulesOfWords, MustBelongToADomain) {
  EXPECT_EQ(Refusal(ObjectAccess("unlabeled"), {77, "owner"}), "unknown domain 77");
}

TEST_F(RulesOfWords, MustNotConfuseDomains) {
  const Rule rule = ObjectAccess("unlabeled");
  EXPECT_EQ(Refusal(rule, {domain, "other"}), "domain 2 is 'owner', not 'other'");
  EXPECT_EQ(Refusal(rule, {domain, ""}), "");
}

TEST_F(RulesOfWords, MustUseWordsThatExist) {
  const std::tuple<RuleKind, Words, const char*> refusals[] = {
      {RuleKind::kObjectAccess, {"nothing", "read"}, "unknown label 'nothing'"},
      {RuleKind::kObjectAccess, {"unlabeled", "eat"}, "unknown object access kind 'eat'"},
      {RuleKind::kObjectAccess, {"", ""}, "unknown label ''"},
      {RuleKind::kSyscall, {"no_call"}, "unknown system call 'no_call'"},
      {RuleKind::kCapability, {"cap_x"}, "unknown capability 'cap_x'"},
      {RuleKind::kFileCreation, {"unlabeled", "nothing", "fifo"}, "unknown label 'nothing'"},
      {RuleKind::kUnixSocketCreation,
       {"unlabeled", "raw"},
       "unknown unix socket creation kind 'raw'"},
  };
  for (const auto& [kind, words, refusal] : refusals) {
    EXPECT_EQ(Refusal({.kind = kind, .words = words, .verdict = true}), refusal);
  }
  EXPECT_THAT(Labels(), ElementsAre());
}

TEST_F(RulesOfWords, MustNameTheTargetOfATransition) {
  Rule rule = {.kind = RuleKind::kDomainTransition,
               .words = {"unlabeled", "hostDom", "exec"},
               .verdict = true};
  EXPECT_EQ(Refusal(rule, {domain, {}}, 0), "");
  EXPECT_EQ(Refusal(rule, {domain, {}}, domain), "domain 2 is 'owner', not 'hostDom'");
  EXPECT_EQ(Refusal(rule, {domain, {}}, 77), "unknown domain 77");
  rule.words[2] = "jump";
  EXPECT_EQ(Refusal(rule, {domain, {}}, 0), "unknown domain transition kind 'jump'");
}

TEST_F(RulesOfWords, KeepTheirWordsVerdictsAndLines) {
  Install({.kind = RuleKind::kFileCreation,
           .words = {"unlabeled", "tardiskDefault", "fifo"},
           .verdict = true,
           .line = 7});
  Install({.kind = RuleKind::kFileCreation,
           .words = {"tardiskDefault", "unlabeled", "regular"},
           .verdict = false,
           .line = 9});
  const std::vector<Rule> rules = state.Rules().Read(domain, RuleKind::kFileCreation);
  ASSERT_EQ(rules.size(), 2U);
  EXPECT_EQ(rules[0].Text(), "-f unlabeled tardiskDefault fifo grant");
  EXPECT_EQ(rules[0].line, 7U);
  EXPECT_EQ(rules[1].Text(), "-f tardiskDefault unlabeled regular revoke");
  EXPECT_EQ(rules[1].line, 9U);
}

TEST_F(RulesOfWords, SeeWhatAnotherConnectionHasJustMade) {
  const auto other = std::make_shared<HostState>(directory.Database());
  Install(ObjectAccess("unlabeled"));
  other->Labels().Add({"tool"});
  EXPECT_EQ(Refusal(ObjectAccess("tool")), "");
  EXPECT_THAT(Labels(), ElementsAre("unlabeled", "tool"));
}

TEST_F(RulesOfWords, AreNotFooledByWhatAnotherConnectionHasJustRemoved) {
  const auto other = std::make_shared<HostState>(directory.Database());
  state.Labels().Add({"tool"});
  Install(ObjectAccess("tool"));
  other->Refresh();
  other->Labels().Remove({"tool"});
  EXPECT_EQ(Refusal(ObjectAccess("tool")), "unknown label 'tool'");
  other->Domains().Destroy(domain);
  EXPECT_EQ(Refusal(ObjectAccess("unlabeled")), "unknown domain 2");
  other->Domains().Create("heir", TESKACCESS_DEFAULT_DOM_NONE, false);
  EXPECT_EQ(Refusal(ObjectAccess("unlabeled")), "domain 2 is 'heir', not 'owner'");
  EXPECT_THAT(Labels(), ElementsAre());
}

TEST_F(RulesOfWords, AreKeptApartByKind) {
  Install({.kind = RuleKind::kSyscall, .words = {"read"}, .verdict = true});
  Install({.kind = RuleKind::kCapability, .words = {"cap_kill"}, .verdict = true});
  EXPECT_THAT(Labels(RuleKind::kSyscall), ElementsAre("read"));
  EXPECT_THAT(Labels(RuleKind::kCapability), ElementsAre("cap_kill"));
  EXPECT_THAT(Labels(RuleKind::kObjectAccess), ElementsAre());
}

}  // namespace
}  // namespace LinuxHostTest
