// A load is seen as a whole or not at all, and leaves exactly what its files, the files of the
// other kind and services have installed.

#include "host/linux/operation/policy_load.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <list>
#include <string>
#include <vector>

#include "child_process.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/file_policy_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/label_table.h"
#include "host/linux/state/world_table.h"
#include "state_directory.h"
#include "support/message_of.h"
#include "teskctl/security.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using LinuxHost::LoadEnding;
using LinuxHost::LoadKind;
using LinuxHost::PolicyTransaction;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using TeskCtl::Security::TESKACCESS_LABEL_DOMAIN;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

// What the files of a load say of one domain.
struct DomainFile {
  std::string name;
  std::vector<std::string> calls;  // revoked ones begin with '!'
};

class PolicyLoad : public ::testing::Test {
 protected:
  void GrantCall(unsigned int id, const std::string& call, unsigned int line) {
    const bool grant = call.front() != '!';
    access.SetSyscallRule({.line = line,
                           .domainId = id,
                           .domainName = {},
                           .syscall = grant ? call : call.substr(1),
                           .grant = grant});
  }

  // A rule of each table: from line `line` of a file, or from a service when that is 0.
  void GrantOfEachTable(unsigned int id, unsigned int line, bool grant) {
    GrantCall(id, grant ? "open" : "!open", line);
    access.SetCapabilityParamRule({.line = line,
                                   .domainId = id,
                                   .domainName = {},
                                   .paramCheck = "bind_port",
                                   .firstParam = "80",
                                   .secondParam = {},
                                   .grant = grant});
    std::list<TeskCtl::Security::TeskAccess_FilePathAccessRule> paths = {
        {.line = line,
         .domainId = id,
         .domainName = {},
         .path = "/etc",
         .permissions = grant ? "rw" : "r"}};
    access.SetFilePathAccessRules(paths);
  }

  // How many rules wait for others to go, in each table.
  static std::string Covered() {
    auto rows = HostState::Current().Database().Select(
        "SELECT (SELECT count(*) FROM covered_rule) || ' ' || "
        "(SELECT count(*) FROM covered_parameter_rule) || ' ' || "
        "(SELECT count(*) FROM covered_file_policy)");
    return rows.Next() ? rows.Text(0) : "";
  }

  // As the library does it: all domains first, then their rules.
  void Install(const std::vector<DomainFile>& files) {
    for (const auto& file : files) {
      unsigned int id = 0;
      if (!access.FindDomain(file.name, &id)) {
        access.CreateDomain(file.name, TESKACCESS_DEFAULT_DOM_NONE);
      }
    }
    for (const auto& file : files) {
      unsigned int line = 0;
      for (const std::string& call : file.calls) GrantCall(IdOf(file.name), call, ++line);
    }
  }

  static std::vector<std::string> NamesOf(const std::vector<DomainFile>& files) {
    std::vector<std::string> names;
    for (const auto& file : files) names.push_back(file.name);
    return names;
  }

  LoadEnding Load(const std::vector<DomainFile>& files, LoadKind kind = LoadKind::kFull,
                  bool remove = true) {
    PolicyTransaction transaction(HostState::Current());
    transaction.BeginLoad({.kind = kind, .directory = "/p", .domains = NamesOf(files)});
    Install(files);
    const LoadEnding ending = transaction.EndLoad(remove);
    transaction.Commit();
    return ending;
  }

  unsigned int IdOf(const std::string& name) {
    unsigned int id = 0;
    EXPECT_TRUE(access.FindDomain(name, &id)) << name;
    return id;
  }

  bool Exists(const std::string& name) {
    unsigned int id = 0;
    return access.FindDomain(name, &id);
  }

  std::vector<std::string> CallsOf(const std::string& name) {
    std::list<TeskCtl::Security::TeskAccess_SyscallRule> rules;
    access.GetSyscallRules(IdOf(name), rules);
    std::vector<std::string> calls;
    for (const auto& rule : rules) calls.push_back((rule.grant ? "" : "!") + rule.syscall);
    return calls;
  }

  StateDirectory directory;
  TeskAccessInterfaceImpl access;
};

TEST_F(PolicyLoad, IsSeenByOthersOnlyAsAWhole) {
  Load({{"d", {"read"}}});
  PolicyTransaction transaction(HostState::Current());
  transaction.BeginLoad({.directory = "/p", .domains = {"d", "e"}});
  Install({{"d", {"write"}}, {"e", {}}});
  EXPECT_EQ(
      RunInChild([&] {
        TeskAccessInterfaceImpl other;
        std::list<TeskCtl::Security::TeskAccess_SyscallRule> rules;
        other.GetSyscallRules(2, rules);
        unsigned int id = 0;
        if (other.FindDomain("e", &id) || rules.size() != 1 || rules.front().syscall != "read") {
          throw std::runtime_error("half a load is seen");
        }
      }),
      "");
  transaction.EndLoad(true);
  transaction.Commit();
  EXPECT_THAT(CallsOf("d"), ElementsAre("write"));
}

TEST_F(PolicyLoad, ThatIsNotCommittedNeverWas) {
  Load({{"d", {"read"}}});
  {
    PolicyTransaction transaction(HostState::Current());
    transaction.BeginLoad({.directory = "/p", .domains = {"e"}});
    Install({{"e", {"write"}}});
    access.AddLabels({"new"}, TESKACCESS_LABEL_OBJECT);
    EXPECT_NE(access.LookupLabel("new", TESKACCESS_LABEL_OBJECT), LinuxHost::kNoLabel);
    transaction.EndLoad(true);
    EXPECT_FALSE(Exists("d"));
  }
  EXPECT_THAT(CallsOf("d"), ElementsAre("read"));
  EXPECT_FALSE(Exists("e"));
  EXPECT_EQ(access.LookupLabel("new", TESKACCESS_LABEL_OBJECT), LinuxHost::kNoLabel);
}

TEST_F(PolicyLoad, OfAProcessThatIsKilledNeverWas) {
  Load({{"d", {"read"}}});
  ChildProcess child([] {
    PolicyTransaction transaction(HostState::Current());
    transaction.BeginLoad({.directory = "/p", .domains = {}});
    transaction.EndLoad(true);
    kill(getpid(), SIGKILL);
  });
  EXPECT_EQ(child.Wait(), "killed");
  EXPECT_THAT(CallsOf("d"), ElementsAre("read"));
}

TEST_F(PolicyLoad, SeesWhatItHasInstalledItself) {
  PolicyTransaction transaction(HostState::Current());
  transaction.BeginLoad({.directory = "/p", .domains = {"d"}});
  Install({{"d", {"read"}}});
  access.AddLabels({"key"}, TESKACCESS_LABEL_OBJECT);
  access.SetObjectAccessRule({.line = 1,
                              .domainId = IdOf("d"),
                              .domainName = {},
                              .label = "key",
                              .accessKind = "read",
                              .grant = true});
  access.RemoveLabels({"key"}, TESKACCESS_LABEL_OBJECT);
  std::list<TeskCtl::Security::TeskAccess_ObjectAccessRule> rules;
  access.GetObjectAccessRules(IdOf("d"), rules);
  EXPECT_THAT(rules, IsEmpty());
  EXPECT_THAT(CallsOf("d"), ElementsAre("read"));
}

TEST_F(PolicyLoad, ARefusedCallUndoesOnlyItself) {
  PolicyTransaction transaction(HostState::Current());
  transaction.BeginLoad({.directory = "/p", .domains = {"d"}});
  Install({{"d", {"read"}}});
  EXPECT_EQ(MessageOf([&] {
              access.AddLabels({"good", ""}, TESKACCESS_LABEL_OBJECT);
            }),
            "a label needs a name");
  EXPECT_EQ(MessageOf([&] {
              access.AddLabels({"e", ""}, TeskCtl::Security::TESKACCESS_LABEL_DOMAIN);
            }),
            "a domain name must not be empty");
  EXPECT_FALSE(Exists("e"));
  transaction.EndLoad(true);
  transaction.Commit();
  EXPECT_THAT(CallsOf("d"), ElementsAre("read"));
}

TEST_F(PolicyLoad, RemovesWhatItsFilesHaveNoMore) {
  Load({{"d", {"read", "write", "open"}}});
  const LoadEnding ending = Load({{"d", {"write"}}});
  EXPECT_EQ(ending.removed.rules, 2U);
  EXPECT_TRUE(ending.staying.IsEmpty());
  EXPECT_THAT(CallsOf("d"), ElementsAre("write"));
  EXPECT_TRUE(Load({{"d", {"write"}}}).removed.IsEmpty());
}

TEST_F(PolicyLoad, RemovesRulesOfEveryTable) {
  const auto load = [&](bool withRules) {
    PolicyTransaction transaction(HostState::Current());
    transaction.BeginLoad({.directory = "/p", .domains = {"d"}});
    Install({{"d", {}}});
    const unsigned int id = IdOf("d");
    if (withRules) GrantOfEachTable(id, 1, true);
    const LoadEnding ending = transaction.EndLoad(true);
    transaction.Commit();
    return ending;
  };
  load(true);
  EXPECT_EQ(load(false).removed.rules, 3U);
  EXPECT_THAT(CallsOf("d"), IsEmpty());
  std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule> checks;
  access.GetCapabilityParamRules(IdOf("d"), checks);
  EXPECT_THAT(checks, IsEmpty());
  std::list<TeskCtl::Security::TeskAccess_FilePathAccessRule> paths;
  access.GetFilePathAccessRules(IdOf("d"), paths);
  EXPECT_THAT(paths, IsEmpty());
}

TEST_F(PolicyLoad, KeepsEverythingWhenNothingIsToBeRemoved) {
  Load({{"d", {"read", "write"}}, {"e", {"open"}}});
  const LoadEnding ending = Load({{"d", {"read"}}}, LoadKind::kFull, false);
  EXPECT_TRUE(ending.removed.IsEmpty());
  EXPECT_EQ(ending.staying.rules, 2U);
  EXPECT_THAT(ending.staying.domains, ElementsAre("e"));
  EXPECT_THAT(CallsOf("e"), ElementsAre("open"));
  const LoadEnding next = Load({{"d", {"read"}}});
  EXPECT_EQ(next.removed.rules, 2U);
  EXPECT_THAT(next.removed.domains, ElementsAre("e"));
}

TEST_F(PolicyLoad, KeepsWhatServicesHaveMade) {
  Load({{"d", {"read"}}});
  GrantCall(IdOf("d"), "open", 0);
  Load({{"d", {}}});
  EXPECT_THAT(CallsOf("d"), ElementsAre("open"));
}

TEST_F(PolicyLoad, PutsBackWhatAServiceHadMadeAndAFileHadCovered) {
  Load({{"d", {}}});
  GrantCall(IdOf("d"), "!open", 0);
  Load({{"d", {"open"}}});
  EXPECT_THAT(CallsOf("d"), ElementsAre("open"));
  Load({{"d", {"open"}}});
  EXPECT_TRUE(Load({{"d", {}}}).removed.IsEmpty());
  EXPECT_THAT(CallsOf("d"), ElementsAre("!open"));
}

// The next domain in the slot would get them back.
TEST_F(PolicyLoad, ADestroyedDomainTakesWhatWasCoveredAlong) {
  Load({{"d", {}}});
  const unsigned int id = IdOf("d");
  GrantOfEachTable(id, 0, false);
  PolicyTransaction transaction(HostState::Current());
  transaction.BeginLoad({.directory = "/p", .domains = {"d"}});
  GrantOfEachTable(id, 1, true);
  transaction.EndLoad(true);
  transaction.Commit();
  ASSERT_EQ(Covered(), "1 1 1");
  access.RemoveLabels({"d"}, TESKACCESS_LABEL_DOMAIN);
  EXPECT_EQ(Covered(), "0 0 0");
}

// A later version of this program finds them in the state.
TEST_F(PolicyLoad, HasTheNumberOfItsKindInTheState) {
  Load({{"d", {}}}, LoadKind::kEarly);
  Load({{"d", {}}});
  auto rows = HostState::Current().Database().Select(
      "SELECT group_concat(kind, ' ') FROM (SELECT kind FROM policy_load ORDER BY number)");
  ASSERT_TRUE(rows.Next());
  EXPECT_EQ(rows.Text(0), "1 2");
}

TEST_F(PolicyLoad, LeavesTheEarlyPolicyAlone) {
  Load({{"boot", {"reboot", "read"}}}, LoadKind::kEarly);
  Load({{"boot", {"!reboot", "write"}}, {"d", {}}});
  EXPECT_THAT(CallsOf("boot"), ElementsAre("read", "!reboot", "write"));
  // Without its lines in the full policy, the early one is as it was.
  EXPECT_EQ(Load({{"d", {}}}).removed.rules, 1U);
  EXPECT_THAT(CallsOf("boot"), ElementsAre("read", "reboot"));
}

TEST_F(PolicyLoad, OfTheEarlyPolicyRemovesWhatIsItsOwn) {
  Load({{"boot", {"reboot", "read"}}}, LoadKind::kEarly);
  Load({{"d", {"open"}}});
  EXPECT_EQ(Load({{"boot", {"read"}}}, LoadKind::kEarly).removed.rules, 1U);
  EXPECT_THAT(CallsOf("boot"), ElementsAre("read"));
  EXPECT_THAT(CallsOf("d"), ElementsAre("open"));
}

TEST_F(PolicyLoad, OfTheEarlyPolicyUncoversTheFullOneAgain) {
  Load({{"d", {"open"}}});
  Load({{"d", {"!open"}}}, LoadKind::kEarly);
  EXPECT_THAT(CallsOf("d"), ElementsAre("!open"));
  Load({{"d", {}}}, LoadKind::kEarly);
  EXPECT_THAT(CallsOf("d"), ElementsAre("open"));
}

TEST_F(PolicyLoad, DestroysDomainsThatNoFileDefines) {
  Load({{"d", {"read"}}, {"e", {}}});
  const LoadEnding ending = Load({{"e", {}}});
  EXPECT_THAT(ending.removed.domains, ElementsAre("d"));
  EXPECT_EQ(ending.removed.rules, 1U);
  EXPECT_FALSE(Exists("d"));
}

TEST_F(PolicyLoad, LeavesADomainInWhichAWorldRuns) {
  Load({{"d", {"read"}}});
  HostState::Current().Worlds().Place(getpid(), IdOf("d"));
  const LoadEnding ending = Load({});
  EXPECT_THAT(ending.staying.domains, ElementsAre("d"));
  EXPECT_EQ(ending.removed.rules, 1U);
  EXPECT_THAT(CallsOf("d"), IsEmpty());
  HostState::Current().Worlds().Place(getpid(), LinuxHost::kStartDomain);
  EXPECT_THAT(Load({}).removed.domains, ElementsAre("d"));
}

TEST_F(PolicyLoad, LeavesDomainsOfServicesAndOfTheOtherKind) {
  HostState::Current().Domains().Create("job", TESKACCESS_DEFAULT_DOM_NONE, true);
  Load({{"both", {}}, {"boot", {}}}, LoadKind::kEarly);
  Load({{"both", {}}, {"job", {}}});
  EXPECT_TRUE(Load({}).removed.domains.empty());
  EXPECT_TRUE(Exists("job") && Exists("both") && Exists("boot"));
}

TEST_F(PolicyLoad, DoesNotFindADomainThatNoFileDefines) {
  Load({{"d", {}}, {"gone", {}}});
  PolicyTransaction transaction(HostState::Current());
  transaction.BeginLoad({.directory = "/p", .domains = {"d"}});
  EXPECT_FALSE(Exists("gone"));
  EXPECT_EQ(MessageOf([&] {
              access.ValidateKeyword(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL, "gone");
            }),
            "unknown label 'gone'");
  transaction.EndLoad(false);
  EXPECT_TRUE(Exists("gone"));
}

TEST_F(PolicyLoad, TakesADomainThatAppearsMeanwhile) {
  Load({{"d", {}}, {"late", {"read"}}});
  const unsigned int id = IdOf("late");
  PolicyTransaction transaction(HostState::Current());
  transaction.BeginLoad({.directory = "/p", .domains = {"d"}});
  EXPECT_EQ(access.CreateDomain("late", TESKACCESS_DEFAULT_DOM_NONE), id);
  EXPECT_TRUE(Exists("late"));
}

TEST_F(PolicyLoad, ARemovedPolicyOfAServiceDoesNotComeBack) {
  Load({{"d", {}}});
  const unsigned int id = IdOf("d");
  auto& policies = HostState::Current().FilePolicies();
  const LinuxHost::FilePolicy policy = {.domain = {id, {}}, .path = "/etc", .permission = 1};
  policies.Install({&policy, 1});
  {
    PolicyTransaction transaction(HostState::Current());
    transaction.BeginLoad({.directory = "/p", .domains = {"d"}});
    policies.Install({&policy, 1});
    transaction.EndLoad(true);
    transaction.Commit();
  }
  policies.Remove(id, 0, "/etc");
  Load({{"d", {}}});
  EXPECT_EQ(policies.Count(id), 0U);
}

}  // namespace
}  // namespace LinuxHostTest
