// A change that an agent does not notice, and a reading that it takes for one.
#include "host/linux/operation/change_mark.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <functional>
#include <list>
#include <string>

#include "child_process.h"
#include "host/linux/common/host_error.h"
#include "host/linux/operation/load_record.h"
#include "host/linux/operation/policy_count.h"
#include "host/linux/operation/policy_load.h"
#include "host/linux/operation/published_plans.h"
#include "host/linux/operation/saved_policy.h"
#include "host/linux/operation/stable_view.h"
#include "host/linux/operation/store_copy.h"
#include "host/linux/state/host_state.h"
#include "state_directory.h"
#include "teskctl/security.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::ChangedSince;
using LinuxHost::HostState;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;
using TeskCtl::Security::TeskAccessInterfaceImpl;

// Something that is done to a state that has the domain "a" with one rule of each kind of table.
struct Deed {
  const char* name;
  std::function<void(HostState& state, unsigned int domain)> act;
};

void PrintTo(const Deed& deed, std::ostream* output) { *output << deed.name; }

void InstallRule(HostState& state, unsigned int domain, bool granted) {
  state.Rules().Install(
      {domain, "a"}, {.kind = Policy::RuleKind::kSyscall, .words = {"read"}, .verdict = granted});
}

void InstallPath(HostState& state, unsigned int domain, const std::string& path) {
  const LinuxHost::FilePolicy policy = {.domain = {domain, "a"}, .path = path, .permission = 1};
  state.FilePolicies().Install({&policy, 1});
}

class ChangeMark : public ::testing::TestWithParam<Deed> {
 protected:
  ChangeMark() {
    InstallRule(state, domain, true);
    InstallPath(state, domain, "/etc");
    state.ParameterRules().Install(
        {domain, "a"},
        {.kind = Policy::RuleKind::kParameterCheck, .words = {"bind_port", "80"}, .verdict = true});
    state.Labels().Add({"aLabel"});
  }

  StateDirectory directory;
  HostState& state = HostState::Current();
  const unsigned int domain = state.Domains().Create("a", TESKACCESS_DEFAULT_DOM_NONE, true);
};

void PublishNoPlans() {
  ASSERT_TRUE(LinuxHost::PlansInTheMaking().Publish({}));
  ASSERT_TRUE(LinuxHost::ArePlansPublished());
}

TEST(PlansThatCannotBeEnded, LetNothingBeCommitted) {
  const StateDirectory directory;
  HostState& state = HostState::Current();
  // Nothing takes a directory for a file to remove.
  const std::string current = directory.Path() + "/plans/.current";
  std::filesystem::create_directories(current);
  EXPECT_THROW(state.Domains().Create("a", TESKACCESS_DEFAULT_DOM_NONE, true),
               LinuxHost::HostError);
  std::filesystem::remove(current);
  EXPECT_NO_THROW(state.Domains().Create("a", TESKACCESS_DEFAULT_DOM_NONE, true));
}

class Change : public ChangeMark {};

TEST_P(Change, IsNoticed) {
  const LinuxHost::ChangeMark mark = LinuxHost::TakeChangeMark();
  ASSERT_FALSE(ChangedSince(mark));
  GetParam().act(state, domain);
  EXPECT_TRUE(ChangedSince(mark));
  EXPECT_FALSE(ChangedSince(LinuxHost::TakeChangeMark()));
}

TEST_P(Change, EndsThePlansOfTheState) {
  PublishNoPlans();
  GetParam().act(state, domain);
  EXPECT_FALSE(LinuxHost::ArePlansPublished());
}

TEST_P(Change, OfAnotherProcessIsNoticed) {
  const LinuxHost::ChangeMark mark = LinuxHost::TakeChangeMark();
  ASSERT_EQ(RunInChild([&] { GetParam().act(HostState::Current(), domain); }), "");
  EXPECT_TRUE(ChangedSince(mark));
}

INSTANTIATE_TEST_SUITE_P(
    All, Change,
    testing::Values(
        Deed{"new rule",
             [](HostState& state, unsigned int domain) {
               state.Rules().Install(
                   {domain, "a"},
                   {.kind = Policy::RuleKind::kSyscall, .words = {"write"}, .verdict = true});
             }},
        Deed{"other grant",
             [](HostState& state, unsigned int domain) { InstallRule(state, domain, false); }},
        Deed{"new path",
             [](HostState& state, unsigned int domain) { InstallPath(state, domain, "/srv"); }},
        Deed{"other permission",
             [](HostState& state, unsigned int domain) {
               state.FilePolicies().Update(domain, "/etc", 2);
             }},
        Deed{"path gone",
             [](HostState& state, unsigned int domain) {
               state.FilePolicies().Remove(domain, 0, "/etc");
             }},
        Deed{"parameter rule gone",
             [](HostState& state, unsigned int domain) {
               state.ParameterRules().Remove(domain, "bind_port", {80, 80});
             }},
        Deed{"new domain",
             [](HostState& state, unsigned int /*domain*/) {
               state.Domains().Create("b", TESKACCESS_DEFAULT_DOM_NONE, false);
             }},
        Deed{"domain gone",
             [](HostState& state, unsigned int domain) { state.Domains().Destroy(domain); }},
        Deed{"level", [](HostState& state,
                         unsigned int /*domain*/) { state.Domains().SetLevel("a", "disabled"); }},
        Deed{"part",
             [](HostState& state, unsigned int domain) {
               state.Domains().SetRole(LinuxHost::DomainRole::IoFilter, domain);
             }},
        Deed{"new label",
             [](HostState& state, unsigned int /*domain*/) { state.Labels().Add({"bLabel"}); }},
        Deed{"label gone",
             [](HostState& state, unsigned int /*domain*/) { state.Labels().Remove({"aLabel"}); }},
        Deed{"boot", [](HostState& state, unsigned int /*domain*/) { state.Reset(); }},
        Deed{"load",
             [](HostState& /*state*/, unsigned int domain) {
               LinuxHost::PolicyTransaction load(HostState::Current());
               load.BeginLoad({.directory = "/policy", .domains = {}});
               InstallRule(HostState::Current(), domain, true);
               load.EndLoad(true);
               load.Commit();
             }},
        Deed{"rollback",
             [](HostState& state, unsigned int /*domain*/) {
               const std::string copy = state.Directory() + "/copy.db";
               LinuxHost::CopyDatabase(state.Database().Path(), LinuxHost::CopyOf::kState, copy);
               LinuxHost::RestorePolicy(copy);
             }},
        Deed{"other state",
             [](HostState& state, unsigned int /*domain*/) {
               const std::string path = state.Database().Path();
               for (const char* part : {"", "-wal", "-shm"}) {
                 std::filesystem::rename(path + part, path + ".aside" + part);
               }
               HostState::Current();
             }}),
    [](const auto& tested) {
      std::string name = tested.param.name;
      for (char& letter : name) letter = letter == ' ' ? '_' : letter;
      return name;
    });

class NoChange : public ChangeMark {};

TEST_P(NoChange, IsTakenForOne) {
  const LinuxHost::ChangeMark mark = LinuxHost::TakeChangeMark();
  GetParam().act(state, domain);
  EXPECT_FALSE(ChangedSince(mark));
  ASSERT_EQ(RunInChild([&] { GetParam().act(HostState::Current(), domain); }), "");
  EXPECT_FALSE(ChangedSince(mark));
}

TEST_P(NoChange, KeepsThePlansOfTheState) {
  PublishNoPlans();
  GetParam().act(state, domain);
  EXPECT_TRUE(LinuxHost::ArePlansPublished());
}

INSTANTIATE_TEST_SUITE_P(
    All, NoChange,
    testing::Values(Deed{"reading",
                         [](HostState& /*state*/, unsigned int domain) {
                           TeskAccessInterfaceImpl access;
                           std::list<TeskCtl::Security::TeskAccess_SyscallRule> rules;
                           access.GetSyscallRules(domain, rules);
                           access.LookupLabel("aLabel", TESKACCESS_LABEL_OBJECT);
                           LinuxHost::CountPolicy(HostState::Current());
                           LinuxHost::LatestLoad(HostState::Current());
                         }},
                    Deed{"view",
                         [](HostState& state, unsigned int domain) {
                           const LinuxHost::StableView view(HostState::Current());
                           state.FilePolicies().Read(domain);
                         }},
                    Deed{"copy",
                         [](HostState& state, unsigned int /*domain*/) {
                           LinuxHost::CopyDatabase(state.Database().Path(),
                                                   LinuxHost::CopyOf::kState,
                                                   state.Directory() + "/copy.db");
                         }},
                    Deed{"load undone",
                         [](HostState& /*state*/, unsigned int domain) {
                           LinuxHost::PolicyTransaction load(HostState::Current());
                           load.BeginLoad({.directory = "/policy", .domains = {}});
                           InstallRule(HostState::Current(), domain, false);
                         }}),
    [](const auto& tested) {
      std::string name = tested.param.name;
      for (char& letter : name) letter = letter == ' ' ? '_' : letter;
      return name;
    });

}  // namespace
}  // namespace LinuxHostTest
