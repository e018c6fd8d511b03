#include "host/linux/state/rule_table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/label_table.h"
#include "message_of.h"
#include "state_directory.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using LinuxHost::Rule;
using LinuxHost::RuleKind;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using ::testing::ElementsAre;

class RulesOfWords : public ::testing::Test {
 protected:
  Rule ObjectAccess(std::string_view label, std::string_view kind = "read") const {
    return {.domain = {domain, "owner"},
            .kind = RuleKind::ObjectAccess,
            .words = {label, kind},
            .granted = true,
            .line = 1};
  }

  std::string Refusal(const Rule& rule) {
    return MessageOf([&] { state.Rules().Install(rule); });
  }

  std::vector<std::string> Labels(RuleKind kind = RuleKind::ObjectAccess) {
    std::vector<std::string> labels;
    for (auto rows = state.Rules().Read(domain, kind); rows.Next();) labels.push_back(rows.Text(0));
    return labels;
  }

  StateDirectory directory;
  HostState& state = HostState::Current();
  unsigned int domain = state.Domains().Create("owner", TESKACCESS_DEFAULT_DOM_NONE, false);
};

TEST_F(RulesOfWords, MustBelongToADomain) {
  Rule rule = ObjectAccess("unlabeled");
  rule.domain.id = 77;
  EXPECT_EQ(Refusal(rule), "unknown domain 77");
}

TEST_F(RulesOfWords, MustNotConfuseDomains) {
  Rule rule = ObjectAccess("unlabeled");
  rule.domain.name = "other";
  EXPECT_EQ(Refusal(rule), "domain 2 is 'owner', not 'other'");
  rule.domain.name = "";
  EXPECT_EQ(Refusal(rule), "");
}

TEST_F(RulesOfWords, MustUseWordsThatExist) {
  EXPECT_EQ(Refusal(ObjectAccess("nothing")), "unknown label 'nothing'");
  EXPECT_EQ(Refusal(ObjectAccess("unlabeled", "eat")), "unknown object access kind 'eat'");
  EXPECT_EQ(Refusal(ObjectAccess("", "")), "unknown label ''");
  EXPECT_EQ(Refusal({.domain = {domain, {}}, .words = {"no_call"}}),
            "unknown system call 'no_call'");
  EXPECT_EQ(Refusal({.domain = {domain, {}}, .kind = RuleKind::Capability, .words = {"cap_x"}}),
            "unknown capability 'cap_x'");
  EXPECT_EQ(Refusal({.domain = {domain, {}},
                     .kind = RuleKind::FileCreation,
                     .words = {"unlabeled", "nothing", "fifo"}}),
            "unknown label 'nothing'");
  EXPECT_EQ(Refusal({.domain = {domain, {}},
                     .kind = RuleKind::UnixSocketCreation,
                     .words = {"unlabeled", "raw"}}),
            "unknown unix socket creation kind 'raw'");
  EXPECT_THAT(Labels(), ElementsAre());
}

TEST_F(RulesOfWords, MustNameTheTargetOfATransition) {
  Rule rule = {.domain = {domain, {}},
               .kind = RuleKind::DomainTransition,
               .words = {"unlabeled", "hostDom", "exec"},
               .targetId = 0};
  EXPECT_EQ(Refusal(rule), "");
  rule.targetId = domain;
  EXPECT_EQ(Refusal(rule), "domain 2 is 'owner', not 'hostDom'");
  rule.targetId = 77;
  EXPECT_EQ(Refusal(rule), "unknown domain 77");
  rule.targetId = 0;
  rule.words[2] = "jump";
  EXPECT_EQ(Refusal(rule), "unknown domain transition kind 'jump'");
}

TEST_F(RulesOfWords, SeeWhatAnotherConnectionHasJustMade) {
  const auto other = std::make_shared<HostState>(directory.Database());
  state.Rules().Install(ObjectAccess("unlabeled"));
  other->Labels().Add({"tool"});
  EXPECT_EQ(Refusal(ObjectAccess("tool")), "");
  EXPECT_THAT(Labels(), ElementsAre("unlabeled", "tool"));
}

TEST_F(RulesOfWords, AreNotFooledByWhatAnotherConnectionHasJustRemoved) {
  const auto other = std::make_shared<HostState>(directory.Database());
  state.Labels().Add({"tool"});
  state.Rules().Install(ObjectAccess("tool"));
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
  state.Rules().Install({.domain = {domain, {}}, .words = {"read"}});
  state.Rules().Install(
      {.domain = {domain, {}}, .kind = RuleKind::Capability, .words = {"cap_kill"}});
  EXPECT_THAT(Labels(RuleKind::Syscall), ElementsAre("read"));
  EXPECT_THAT(Labels(RuleKind::Capability), ElementsAre("cap_kill"));
  EXPECT_THAT(Labels(RuleKind::ObjectAccess), ElementsAre());
}

}  // namespace
}  // namespace LinuxHostTest
