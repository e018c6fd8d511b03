// Labels of objects: numbers are never used again, names fit, and a label that goes takes its
// rules along.

#include "host/linux/state/label_table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/rule_table.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using LinuxHost::kNoLabel;
using Policy::RuleKind;
using SecPolicyTest::MessageOf;
using ::testing::ElementsAre;
using ::testing::Pair;

class Labels : public ::testing::Test {
 protected:
  unsigned int Lookup(const std::string& name) {
    state.Refresh();
    return state.Labels().Lookup(name);
  }

  StateDirectory directory;
  HostState& state = HostState::Current();
};

TEST_F(Labels, GetIdentifiersInTheOrderTheyAreAdded) {
  state.Labels().Add({"b", "a", "b", "unlabeled"});
  state.Refresh();
  EXPECT_THAT(state.Labels().All(), ElementsAre(Pair("a", 5), Pair("b", 4),
                                                Pair("tardiskDefault", 3), Pair("unlabeled", 2)));
}

TEST_F(Labels, NeverGetAnIdentifierAgain) {
  state.Labels().Add({"a", "b"});
  state.Labels().Remove({"b"});
  state.Labels().Add({"c", "b"});
  EXPECT_EQ(Lookup("c"), 6U);
  EXPECT_EQ(Lookup("b"), 7U);
  EXPECT_EQ(MessageOf([&] { state.Labels().Name(5); }), "no label has the identifier 5");
}

TEST_F(Labels, AreAddedAllOrNone) {
  EXPECT_EQ(MessageOf([&] { state.Labels().Add({"a", ""}); }), "a label needs a name");
  EXPECT_EQ(Lookup("a"), kNoLabel);
  EXPECT_EQ(MessageOf([&] {
              state.Labels().Add({"a", std::string("b\0c", 3)});
            }),
            "label 'b' goes on after a NUL byte");
  EXPECT_EQ(Lookup("a"), kNoLabel);
}

TEST_F(Labels, AreAtMost255BytesLong) {
  const std::string longest(255, 'l');
  EXPECT_EQ(MessageOf([&] { state.Labels().Add({longest}); }), "");
  EXPECT_EQ(MessageOf([&] { state.Labels().Add({longest + "l"}); }),
            "label '" + longest + "l' is too long: 256 bytes, at most 255");
}

TEST_F(Labels, StayWhenTheyArePredefined) {
  state.Labels().Remove({"unlabeled", "tardiskDefault", "nothing"});
  EXPECT_EQ(Lookup("unlabeled"), 2U);
  EXPECT_EQ(Lookup("tardiskDefault"), 3U);
}

TEST_F(Labels, TakeTheRulesThatNameThemAlong) {
  state.Labels().Add({"a", "b"});
  state.Refresh();
  const auto install = [&](RuleKind kind, decltype(Policy::Rule::words) words) {
    state.Rules().Install({0, {}}, {.kind = kind, .words = std::move(words), .verdict = false});
  };
  install(RuleKind::kObjectAccess, {"a", "read"});
  install(RuleKind::kObjectAccess, {"b", "read"});
  install(RuleKind::kFileCreation, {"b", "a", "fifo"});
  install(RuleKind::kFileCreation, {"b", "b", "fifo"});
  install(RuleKind::kUnixSocketCreation, {"a", "stream"});
  install(RuleKind::kDomainTransition, {"a", "hostDom", "exec"});
  install(RuleKind::kSyscall, {"read"});
  install(RuleKind::kCapability, {"cap_kill"});

  state.Labels().Remove({"a"});

  const auto count = [&](RuleKind kind) { return state.Rules().Read(0, kind).size(); };
  EXPECT_EQ(count(RuleKind::kObjectAccess), 1U);
  EXPECT_EQ(count(RuleKind::kFileCreation), 1U);
  EXPECT_EQ(count(RuleKind::kUnixSocketCreation), 0U);
  EXPECT_EQ(count(RuleKind::kDomainTransition), 0U);
  EXPECT_EQ(count(RuleKind::kSyscall), 1U);
  EXPECT_EQ(count(RuleKind::kCapability), 1U);
}

TEST_F(Labels, LeaveTheRulesThatNameADomainOfTheSameName) {
  state.Domains().Create("a", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE, false);
  state.Labels().Add({"a"});
  state.Rules().Install(
      {0, {}}, {.kind = RuleKind::kObjectAccess, .words = {"a", "read"}, .verdict = false});
  state.Labels().Remove({"a"});
  EXPECT_EQ(state.Rules().Read(0, RuleKind::kObjectAccess).size(), 1U);
}

TEST_F(Labels, AreSeenByOtherConnections) {
  const auto other = std::make_shared<HostState>(directory.Database());
  EXPECT_EQ(other->Labels().Lookup("a"), kNoLabel);
  state.Labels().Add({"a"});
  other->Refresh();
  EXPECT_EQ(other->Labels().Lookup("a"), 4U);
}

}  // namespace
}  // namespace LinuxHostTest
