// Plans of capabilities: hunts for a number that is not Linux's, for one that stays without a
// grant, and for one that goes without a word.

#include "host/enforce/plan/capability_plan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/capability.h>

#include "enforce/domain_of.h"
#include "policy/capability.h"

namespace EnforceTest {
namespace {

using Enforce::CapabilityPlan;
using Enforce::PlanCapabilities;
using Policy::CapabilityNumber;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::uint64_t kAll = ~std::uint64_t{0};
constexpr unsigned int kLast = CAP_CHECKPOINT_RESTORE;

constexpr std::uint64_t Bits(std::initializer_list<int> numbers) {
  std::uint64_t bits = 0;
  for (const int number : numbers) bits |= std::uint64_t{1} << number;
  return bits;
}

TEST(CapabilityNumber, IsLinuxs) {
  EXPECT_EQ(CapabilityNumber("cap_chown"), CAP_CHOWN);
  EXPECT_EQ(CapabilityNumber("cap_setpcap"), CAP_SETPCAP);
  EXPECT_EQ(CapabilityNumber("cap_linux_immutable"), CAP_LINUX_IMMUTABLE);
  EXPECT_EQ(CapabilityNumber("cap_net_bind_service"), CAP_NET_BIND_SERVICE);
  EXPECT_EQ(CapabilityNumber("cap_net_raw"), CAP_NET_RAW);
  EXPECT_EQ(CapabilityNumber("cap_sys_ptrace"), CAP_SYS_PTRACE);
  EXPECT_EQ(CapabilityNumber("cap_sys_admin"), CAP_SYS_ADMIN);
  EXPECT_EQ(CapabilityNumber("cap_mknod"), CAP_MKNOD);
  EXPECT_EQ(CapabilityNumber("cap_setfcap"), CAP_SETFCAP);
  EXPECT_EQ(CapabilityNumber("cap_syslog"), CAP_SYSLOG);
  EXPECT_EQ(CapabilityNumber("cap_bpf"), CAP_BPF);
  EXPECT_EQ(CapabilityNumber("cap_checkpoint_restore"), CAP_CHECKPOINT_RESTORE);
  EXPECT_EQ(CapabilityNumber("cap_of_nobody"), std::nullopt);
  EXPECT_EQ(CapabilityNumber(""), std::nullopt);
  EXPECT_EQ(Policy::Capabilities().size(), CAP_CHECKPOINT_RESTORE + 1);
}

TEST(PlanCapabilities, KeepsWhatOneGrantsAndNoneRevokes) {
  const CapabilityPlan plan = PlanCapabilities(
      DomainOf({"-c cap_chown grant", "-c cap_bpf grant", "-c cap_kill grant", "-c cap_kill revoke",
                "-c cap_sys_admin revoke", "-s chown grant"}),
      kAll, kLast);
  EXPECT_EQ(plan.kept, Bits({CAP_CHOWN, CAP_BPF}));
  EXPECT_EQ(plan.fates.size(), 5U);
  EXPECT_THAT(Told(plan.fates), IsEmpty());
}

TEST(PlanCapabilities, KeepsNothingWithoutARule) {
  EXPECT_EQ(PlanCapabilities(DomainOf({}), kAll, kLast).kept, 0U);
}

TEST(PlanCapabilities, TellsWhatTheCallerDoesNotHave) {
  const CapabilityPlan plan = PlanCapabilities(
      DomainOf({"-c cap_chown grant", "-c cap_net_admin grant", "-c cap_kill revoke",
                "-c cap_fowner grant", "-c cap_fowner revoke"}),
      Bits({CAP_CHOWN, CAP_SYS_ADMIN}), kLast);
  EXPECT_EQ(plan.kept, Bits({CAP_CHOWN}));
  EXPECT_THAT(Told(plan.fates),
              ElementsAre("narrowed: -c cap_net_admin grant (this user has not cap_net_admin)"));
}

TEST(PlanCapabilities, TellsWhatTheKernelDoesNotHave) {
  const CapabilityPlan plan = PlanCapabilities(
      DomainOf({"-c cap_audit_read grant", "-c cap_perfmon grant"}), kAll, CAP_AUDIT_READ);
  EXPECT_EQ(plan.kept, Bits({CAP_AUDIT_READ}));
  EXPECT_THAT(Told(plan.fates),
              ElementsAre("narrowed: -c cap_perfmon grant (this kernel has no cap_perfmon)"));
}

}  // namespace
}  // namespace EnforceTest
