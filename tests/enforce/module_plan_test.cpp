// Plans for the module: hunts for a rule that it is told otherwise, and for one that is said to be
// kept and is not.

#include "host/enforce/module/module_plan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/capability.h>

#include "enforce/domain_of.h"

namespace EnforceTest {
namespace {

using Enforce::FatesByModule;
using Enforce::ModulePlan;
using Enforce::PlanModule;
using Policy::InstalledDomain;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr unsigned int kLast = CAP_CHECKPOINT_RESTORE;

InstalledDomain Numbered(unsigned int id, Policy::Level level,
                         const std::vector<std::string>& rules) {
  InstalledDomain domain = DomainOf(rules);
  domain.id = id;
  domain.level = level;
  return domain;
}

TEST(PlanModule, HasAllDomains) {
  EXPECT_EQ(Dump(PlanModule({Numbered(3, Policy::Level::kEnforcing,
                                      {"-c cap_chown grant", "-c cap_bpf grant",
                                       "-c cap_kill grant", "-c cap_kill revoke"}),
                             Numbered(7, Policy::Level::kPermissive, {"-c cap_chown revoke"}),
                             Numbered(511, Policy::Level::kDisabled, {"-s chown grant"})},
                            kLast)),
            "domain 3 enforcing: cap_chown cap_bpf\n"
            "domain 7 permissive: none\n"
            "domain 511 disabled: none\n");
}

TEST(PlanModule, GrantsByLinuxsNumbers) {
  const ModulePlan plan =
      PlanModule({DomainOf({"-c cap_chown grant", "-c cap_checkpoint_restore grant"})}, kLast);
  ASSERT_EQ(plan.size(), 1U);
  EXPECT_EQ(plan[0].rules.capabilities,
            std::uint64_t{1} << CAP_CHOWN | std::uint64_t{1} << CAP_CHECKPOINT_RESTORE);
}

TEST(PlanModule, OfNothingIsEmpty) { EXPECT_EQ(Dump(PlanModule({}, kLast)), ""); }

TEST(FatesByModule, KeepsCapabilities) {
  EXPECT_THAT(Told(FatesByModule(DomainOf({"-c cap_chown grant", "-c cap_kill revoke"}), kLast)),
              IsEmpty());
}

TEST(FatesByModule, TellsWhatItDoesNotKeepInOrder) {
  EXPECT_THAT(
      Told(FatesByModule(
          DomainOf({"-s read grant", "-c cap_chown grant", "-r /srv r", "-a object read revoke"}),
          kLast)),
      ElementsAre("notExpressible: -s read grant (the module keeps rules about capabilities alone)",
                  "notExpressible: -r /srv r (the module keeps rules about capabilities alone)",
                  "notExpressible: -a object read revoke (the module keeps rules about "
                  "capabilities alone)"));
}

TEST(FatesByModule, TellsWhatAKernelDoesNotKnow) {
  EXPECT_THAT(Told(FatesByModule(DomainOf({"-c cap_bpf grant"}), CAP_AUDIT_READ)),
              ElementsAre("narrowed: -c cap_bpf grant (this kernel has no cap_bpf)"));
}

}  // namespace
}  // namespace EnforceTest
