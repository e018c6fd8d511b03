// Rules about system calls in plans for the module: hunts for a call that a rule refuses and the
// plan does not, and for a fate that says more than the module does.

#include "host/enforce/module/module_calls.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/capability.h>

#include <algorithm>

#include "enforce/domain_of.h"
#include "host/enforce/module/module_plan.h"
#include "host/enforce/system_calls.h"
#include "policy/call_set.h"
#include "policy/decision.h"

namespace EnforceTest {
namespace {

using Enforce::CallFatesByModule;
using Enforce::GapsByModule;
using Enforce::ModuleRules;
using Policy::InstalledDomain;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

ModuleRules PlanOf(const InstalledDomain& domain) {
  ModuleRules rules = {};
  PlanCallsOfModule(domain, rules);
  return rules;
}

bool Has(const ModuleRules& rules, int table, int number) {
  const auto place = static_cast<unsigned int>(number);
  return (rules.calls[table][place / Enforce::kCallsInWord] >> place % Enforce::kCallsInWord & 1) !=
         0;
}

void ExpectAsDecided(const InstalledDomain& domain) {
  const ModuleRules rules = PlanOf(domain);
  const auto expect = [&](int table, const Enforce::SystemCall& call) {
    const bool isAllowed =
        Decide(Policy::WordsQuestion{Policy::RuleKind::kSyscall, {call.name}}, domain).IsAllowed();
    const bool isRing = call.name.starts_with("io_uring_");
    EXPECT_EQ(Has(rules, table, call.number), isAllowed && !isRing) << call.name;
  };
  for (const auto& call : Enforce::SystemCalls()) expect(Enforce::kCallsOfMachine, call);
  for (const auto& call : Enforce::SystemCallsOf32Bits()) expect(Enforce::kCallsOf32Bits, call);
}

TEST(ModuleCalls, AreThoseThatTheDecisionAllows) {
  ExpectAsDecided(DomainOf({}));
  ExpectAsDecided(DomainOf({"-s @file grant", "-s openat revoke", "-s socketcall grant"}));
  ExpectAsDecided(DomainOf({"-s openat grant", "-s @file revoke", "-s read grant"}));
  ExpectAsDecided(DomainOf({"-s io_uring_setup grant", "-s stat64 grant", "-s @start grant"}));
}

TEST(ModuleCalls, HaveRoomForAllThatThereAre) {
  EXPECT_LT(Enforce::SystemCalls().back().number, int{Enforce::kMostCalls});
  EXPECT_LT(Enforce::SystemCallsOf32Bits().back().number, int{Enforce::kMostCalls});
}

TEST(ModuleCalls, AreFoundByTheirNamesAtHooks) {
  EXPECT_THAT(Enforce::CallsAtHooks(), testing::Contains("vfork"));
  for (const std::string_view call : Enforce::CallsAtHooks())
    EXPECT_TRUE(Enforce::NumberOf(call).has_value()) << call;
}

TEST(ModuleCalls, TellWhatIsNotRefused) {
  EXPECT_THAT(Told(CallFatesByModule(DomainOf(
                  {"-s read grant", "-s read revoke", "-s openat revoke", "-s @file revoke"}))),
              ElementsAre("notExpressible: -s read revoke (not refused, as not each use of it "
                          "comes to a hook)",
                          "notExpressible: -s openat revoke (not refused, as not each use of it "
                          "comes to a hook)",
                          "notExpressible: -s @file revoke (access: not refused, as not each use "
                          "of it comes to a hook)"));
}

TEST(ModuleCalls, TellWhatIsGrantedInVain) {
  EXPECT_THAT(
      Told(CallFatesByModule(DomainOf({"-s io_uring_enter grant", "-s stat64 grant",
                                       "-s s390_runtime_instr grant", "-s fcntl grant"}))),
      ElementsAre("narrowed: -s io_uring_enter grant (refused, as what a ring does is no system "
                  "call)",
                  "narrowed: -s s390_runtime_instr grant (this machine has no such call)",
                  "narrowed: -s fcntl grant (an owner of a descriptor is refused where SIGIO and "
                  "SIGURG may not be sent)"));
  EXPECT_THAT(Told(CallFatesByModule(DomainOf({"-s fcntl grant", "-s kill grant"}))), IsEmpty());
}

TEST(ModuleCalls, TellWhatNoRuleGrantsAndPasses) {
  EXPECT_THAT(GapsByModule(DomainOf({})), ElementsAre(HasSubstr("read and ")));
  std::vector<std::string> all;
  for (const auto& call : Enforce::SystemCalls()) all.push_back("-s " + call.name + " grant");
  EXPECT_THAT(GapsByModule(DomainOf(all)), IsEmpty());
}

TEST(ModuleCalls, HaveTheFlagsThatPass) {
  EXPECT_EQ(PlanOf(DomainOf({})).cloneFlags, ~0ULL);
  EXPECT_EQ(PlanOf(DomainOf({"-p clone_flags 0x300 revoke"})).cloneFlags, ~0x300ULL);
  EXPECT_EQ(PlanOf(DomainOf({"-p clone_flags 0x700 grant", "-p clone_flags 0x1000 grant",
                             "-p clone_flags 0x200 revoke"}))
                .cloneFlags,
            0x1500ULL);
}

TEST(ModuleCalls, TellFlagsThatNoHookSees) {
  EXPECT_THAT(Told(CallFatesByModule(
                  DomainOf({"-p clone_flags 0x400 revoke", "-p clone_flags 0x10000000 revoke"}))),
              ElementsAre("notExpressible: -p clone_flags 0x400 revoke (no hook sees an unshare of "
                          "what threads share)"));
}

TEST(ModuleCalls, HaveDescriptorsSendWhatMayBeSent) {
  EXPECT_EQ(PlanOf(DomainOf({})).ownedSignals, 0U);
  EXPECT_EQ(PlanOf(DomainOf({"-s kill grant"})).ownedSignals, ~0ULL);
  EXPECT_EQ(PlanOf(DomainOf({"-s kill grant", "-p kill_signal 1 2 grant"})).ownedSignals, 3U);
}

}  // namespace
}  // namespace EnforceTest
