// Domains and their slots: names, levels, roles, what keeps them from being destroyed, and what
// must not be left to the next one in the slot.

#include "host/linux/state/domain_table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>

#include "child_process.h"
#include "host/linux/common/host_error.h"
#include "host/linux/state/file_policy_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/parameter_rule_table.h"
#include "host/linux/state/rule_table.h"
#include "host/linux/state/world_table.h"
#include "state_directory.h"
#include "support/message_of.h"
#include "teskctl/security.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::Domain;
using LinuxHost::DomainRole;
using LinuxHost::HostState;
using Policy::RuleKind;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_CHECK_ACCESS;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using TeskCtl::Security::TeskAccessKsi_DefaultDom;
using ::testing::ElementsAre;

class Domains : public ::testing::Test {
 protected:
  unsigned int Create(const std::string& name, bool atRunTime = false) {
    return state.Domains().Create(name, TESKACCESS_DEFAULT_DOM_NONE, atRunTime);
  }

  std::string CreateRefusal(const std::string& name) {
    return MessageOf([&] { Create(name); });
  }

  void GrantTransition(unsigned int from, unsigned int to, bool granted = true) {
    const std::string target = state.Domains().Get(to).name;
    state.Rules().Install({from, {}},
                          {.kind = RuleKind::kDomainTransition,
                           .words = {"unlabeled", target, "exec"},
                           .verdict = granted},
                          to);
  }

  bool HasRules(unsigned int id, RuleKind kind) { return !state.Rules().Read(id, kind).empty(); }

  StateDirectory directory;
  HostState& state = HostState::Current();
};

// ---- Creating.

TEST_F(Domains, FillTheLowestFreeSlotButNeverSlotOne) {
  EXPECT_EQ(Create("a"), 2U);
  EXPECT_EQ(Create("b"), 3U);
  EXPECT_EQ(Create("c"), 4U);
  state.Domains().Destroy(3);
  EXPECT_EQ(Create("d"), 3U);
}

TEST_F(Domains, StartEnforcing) { EXPECT_EQ(state.Domains().Get(Create("a")).level, "enforcing"); }

TEST_F(Domains, KeepTheirNamesToThemselves) {
  const unsigned int id = Create("a");
  EXPECT_EQ(MessageOf([&] { Create("a", true); }), "domain 'a' exists already");
  EXPECT_EQ(MessageOf([&] { Create("hostDom", true); }), "domain 'hostDom' exists already");
  EXPECT_EQ(
      MessageOf([&] { state.Domains().Create("a", TESKACCESS_DEFAULT_DOM_CHECK_ACCESS, false); }),
      "domain 'a' exists already");
  EXPECT_NE(Create("A", true), id);
}

TEST_F(Domains, OfAPolicyAreReturnedWhenTheyExist) {
  const unsigned int id = Create("a");
  EXPECT_EQ(Create("a"), id);
}

TEST_F(Domains, TakeNamesOf63Bytes) {
  const std::string longest(63, 'n');
  EXPECT_EQ(CreateRefusal(longest), "");
  EXPECT_EQ(CreateRefusal(longest + "n"),
            "domain name '" + longest + "n' is too long: 64 bytes, at most 63");
}

TEST_F(Domains, RefuseNamesThatAreNone) {
  EXPECT_EQ(CreateRefusal(""), "a domain name must not be empty");
  EXPECT_EQ(CreateRefusal(std::string("a\0b", 3)), "domain name 'a' goes on after a NUL byte");
}

TEST_F(Domains, RefuseUnknownDefaultRules) {
  EXPECT_EQ(MessageOf([&] {
              state.Domains().Create("a", static_cast<TeskAccessKsi_DefaultDom>(2), false);
            }),
            "unknown default rules 2 for domain 'a'");
  EXPECT_EQ(state.Domains().Find("a"), nullptr);
  EXPECT_NO_THROW(state.Domains().Create("a", TESKACCESS_DEFAULT_DOM_CHECK_ACCESS, false));
}

TEST_F(Domains, FillAllSlotsAndNoMore) {
  for (int domain = 0; domain < 510; ++domain) Create("d" + std::to_string(domain));
  EXPECT_EQ(state.Domains().Get("d509").id, 511U);
  EXPECT_EQ(CreateRefusal("more"), "cannot create domain 'more': all 511 domains are in use");
  state.Domains().Destroy(300);
  EXPECT_EQ(Create("more"), 300U);
}

TEST_F(Domains, AreSeenByOtherConnections) {
  const auto other = std::make_shared<HostState>(directory.Database());
  EXPECT_EQ(other->Domains().Find("a"), nullptr);
  Create("a");
  other->Refresh();
  EXPECT_NE(other->Domains().Find("a"), nullptr);
}

TEST_F(Domains, AreNeverCreatedTwiceByTwoConnections) {
  const auto other = std::make_shared<HostState>(directory.Database());
  Create("a");
  EXPECT_EQ(other->Domains().Create("a", TESKACCESS_DEFAULT_DOM_NONE, false), 2U);
  EXPECT_EQ(other->Domains().Create("b", TESKACCESS_DEFAULT_DOM_NONE, false), 3U);
}

// ---- Destroying.

TEST_F(Domains, AreDestroyedWithTheirRules) {
  const unsigned int id = Create("a");
  state.Rules().Install({id, "a"},
                        {.kind = RuleKind::kSyscall, .words = {"read"}, .verdict = true});
  state.Domains().Destroy(id);
  EXPECT_EQ(state.Domains().Find("a"), nullptr);
  EXPECT_EQ(Create("b"), id);
  EXPECT_FALSE(HasRules(id, RuleKind::kSyscall));
}

// The next domain gets the slot, and must not get what the one before it was allowed.
TEST_F(Domains, LeaveNothingToTheNextOneInTheirSlot) {
  const unsigned int id = Create("a");
  const LinuxHost::FilePolicy policy{.domain = {id, ""}, .path = "/etc", .permission = 1};
  state.FilePolicies().Install({&policy, 1});
  state.ParameterRules().Install(
      {id, ""}, {.kind = RuleKind::kParameterCheck, .words = {"bind_port", "80"}, .verdict = true});
  state.Domains().AddGuestService(id, "time");
  state.Domains().Destroy(id);
  ASSERT_EQ(Create("b"), id);
  EXPECT_EQ(state.FilePolicies().Count(id), 0U);
  EXPECT_TRUE(state.ParameterRules().Read(id).empty());
  EXPECT_THAT(state.Domains().GuestServices(id), ElementsAre());
}

TEST_F(Domains, TakeTheTransitionsIntoThemAlong) {
  const unsigned int from = Create("from");
  const unsigned int to = Create("to");
  const unsigned int other = Create("other");
  GrantTransition(from, to);
  GrantTransition(other, from);
  state.Domains().Destroy(to);
  EXPECT_FALSE(HasRules(from, RuleKind::kDomainTransition));
  EXPECT_TRUE(HasRules(other, RuleKind::kDomainTransition));
}

TEST_F(Domains, TakeTheRulesThatNameThemAsALabelAlong) {
  const unsigned int id = Create("a");
  const unsigned int other = Create("b");
  state.Rules().Install(
      {other, "b"}, {.kind = RuleKind::kObjectAccess, .words = {"a", "read"}, .verdict = false});
  state.Domains().Destroy(id);
  EXPECT_FALSE(HasRules(other, RuleKind::kObjectAccess));
}

TEST_F(Domains, CannotBeDestroyedTwice) {
  const unsigned int id = Create("a");
  state.Domains().Destroy(id);
  EXPECT_EQ(MessageOf([&] { state.Domains().Destroy(id); }), "unknown domain 2");
}

TEST_F(Domains, StayWhenTheyAreBuiltIn) {
  EXPECT_EQ(MessageOf([&] { state.Domains().Destroy(0); }), "domain 'hostDom' is built in");
}

TEST_F(Domains, StayWhileTheyPlayAPart) {
  const unsigned int first = Create("first");
  const unsigned int second = Create("second");
  state.Domains().SetRole(DomainRole::IoFilter, first);
  EXPECT_EQ(MessageOf([&] { state.Domains().Destroy(first); }), "domain 'first' is in use");
  state.Domains().SetRole(DomainRole::IoFilter, second);
  EXPECT_EQ(MessageOf([&] { state.Domains().Destroy(first); }), "");
}

TEST_F(Domains, StayWhileWorldsRunInThem) {
  const unsigned int id = Create("a");
  ChildProcess world([] { pause(); });
  state.Worlds().Place(world.Id(), id);
  EXPECT_EQ(MessageOf([&] { state.Domains().Destroy(id); }), "domain 'a' is in use");
  world.Kill();
  world.Wait();
  EXPECT_EQ(MessageOf([&] { state.Domains().Destroy(id); }), "");
}

TEST_F(Domains, AreRefusedBeyondTheLastSlot) {
  state.Database().Run("INSERT INTO domain VALUES (600, 'far', 'enforcing', 0, 0)");
  state.Database().Run("UPDATE state SET domain_version = domain_version + 1");
  state.Refresh();
  EXPECT_EQ(MessageOf([&] { state.Domains().Find("far"); }),
            "the host state holds a domain 600 beyond the last slot");
}

// ---- Levels, parts and services.

TEST_F(Domains, TakeTheThreeLevels) {
  Create("a");
  for (const char* level : {"permissive", "disabled", "enforcing"}) {
    state.Domains().SetLevel("a", level);
    EXPECT_EQ(state.Domains().Get("a").level, level);
  }
}

TEST_F(Domains, NameTheLevelsWhenAnotherIsWanted) {
  Create("a");
  EXPECT_EQ(MessageOf([&] { state.Domains().SetLevel("a", "Enforcing"); }),
            "unknown enforcement level 'Enforcing' for domain 'a': it must be enforcing, "
            "permissive or disabled");
  EXPECT_EQ(MessageOf([&] { state.Domains().SetLevel("a", ""); }),
            "no enforcement level for domain 'a': it must be enforcing, permissive or disabled");
  EXPECT_EQ(MessageOf([&] { state.Domains().SetLevel("b", "disabled"); }), "unknown domain 'b'");
  EXPECT_EQ(state.Domains().Get("a").level, "enforcing");
}

TEST_F(Domains, ShowTheirPartsInTheirStateWord) {
  const unsigned int plain = Create("plain");
  const unsigned int busy = Create("busy", true);
  state.Domains().SetRole(DomainRole::GlobalVm, busy);
  state.Domains().SetRole(DomainRole::IoFilter, busy);
  state.Domains().SetRole(DomainRole::DaemonFramework, busy);
  EXPECT_EQ(state.Domains().Describe(plain)->StateWord(), 0U);
  EXPECT_EQ(state.Domains().Describe(busy)->StateWord(), 0xfU);
}

TEST_F(Domains, MustExistToPlayAPart) {
  EXPECT_EQ(MessageOf([&] { state.Domains().SetRole(DomainRole::GlobalVm, 77); }),
            "unknown domain 77");
}

TEST_F(Domains, KeepTheirServicesOnce) {
  const unsigned int id = Create("a");
  state.Domains().AddGuestService(id, "time");
  state.Domains().AddGuestService(id, "clipboard");
  state.Domains().AddGuestService(id, "time");
  EXPECT_THAT(state.Domains().GuestServices(id), ElementsAre("clipboard", "time"));
  EXPECT_EQ(MessageOf([&] { state.Domains().AddGuestService(77, "time"); }), "unknown domain 77");
  EXPECT_EQ(MessageOf([&] { state.Domains().AddGuestService(id, ""); }),
            "a guest-communication service must not be empty");
}

// ---- References.

TEST_F(Domains, CountWhatRefersToThem) {
  const unsigned int id = Create("a");
  GrantTransition(0, id);
  GrantTransition(Create("other"), id);
  GrantTransition(Create("refused"), id, false);
  GrantTransition(id, id);
  state.Domains().SetRole(DomainRole::GlobalVm, id);
  state.Worlds().Place(getpid(), id);

  const auto references = state.Domains().CountReferences(state.Domains().Get(id));
  EXPECT_EQ(references.worlds, 1U);
  EXPECT_EQ(references.transitions, 2U);
  EXPECT_EQ(references.roles, 1U);
  EXPECT_EQ(references.Sum(), 4U);
}

TEST_F(Domains, CountEachPartTheyPlay) {
  const unsigned int id = Create("a");
  state.Domains().SetRole(DomainRole::GlobalVm, id);
  state.Domains().SetRole(DomainRole::DaemonFramework, id);
  EXPECT_EQ(state.Domains().CountReferences(state.Domains().Get(id)).Sum(), 2U);
}

// ---- Descriptions.

TEST_F(Domains, AreDescribedWithWhatRefersToThem) {
  const unsigned int id = Create("a", true);
  GrantTransition(0, id);
  state.Domains().SetLevel("a", "disabled");
  const auto description = state.Domains().Describe(id);
  ASSERT_TRUE(description);
  EXPECT_EQ(description->domain.id, id);
  EXPECT_EQ(description->domain.name, "a");
  EXPECT_EQ(description->domain.level, "disabled");
  EXPECT_EQ(description->domain.defaultRules, TESKACCESS_DEFAULT_DOM_NONE);
  EXPECT_TRUE(description->domain.createdAtRunTime);
  EXPECT_EQ(description->references.Sum(), 1U);
  EXPECT_FALSE(state.Domains().Describe(id + 1));
}

TEST_F(Domains, AreDescribedAsOthersLeftThem) {
  const unsigned int id = Create("a");
  ASSERT_EQ(RunInChild([] { HostState::Current().Domains().SetLevel("a", "disabled"); }), "");
  EXPECT_EQ(state.Domains().Get(id).level, "enforcing");
  EXPECT_EQ(state.Domains().Describe(id)->domain.level, "disabled");
}

TEST_F(Domains, AreDescribedWhileSomeoneWrites) {
  const unsigned int id = Create("a");
  const LinuxHost::Transaction writing(state.Database());
  EXPECT_EQ(RunInChild([&] { HostState::Current().Domains().Describe(id).value(); }), "");
}

TEST_F(Domains, LeakWhenNothingRefersToThemAndThePolicyDoesNot) {
  Create("policy");
  const unsigned int leaked = Create("leaked", true);
  const unsigned int entered = Create("entered", true);
  GrantTransition(0, entered);
  EXPECT_THAT(state.Domains().Leaked(), ElementsAre(leaked));
}

// ---- As labels.

TEST_F(Domains, AreCreatedForMissingLabels) {
  Create("a");
  state.Domains().AddMissing({"a", "b", "c", "b"});
  EXPECT_EQ(state.Domains().Get("a").id, 2U);
  EXPECT_EQ(state.Domains().Get("b").id, 3U);
  EXPECT_EQ(state.Domains().Get("c").id, 4U);
}

TEST_F(Domains, AreCreatedForAllLabelsOrNone) {
  EXPECT_EQ(MessageOf([&] {
              state.Domains().AddMissing({"a", ""});
            }),
            "a domain name must not be empty");
  EXPECT_EQ(state.Domains().Find("a"), nullptr);
}

TEST_F(Domains, AreRemovedForLabelsExceptTheStartDomain) {
  Create("a");
  state.Domains().RemoveNamed({"a", "hostDom", "nobody"});
  EXPECT_EQ(state.Domains().Find("a"), nullptr);
  EXPECT_NE(state.Domains().Find("hostDom"), nullptr);
}

}  // namespace
}  // namespace LinuxHostTest
