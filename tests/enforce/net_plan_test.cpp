// Plans of ports: hunts for a port too many, and for a check that this kernel cannot keep and that
// is taken for kept.

#include "host/enforce/plan/net_plan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "enforce/domain_of.h"

namespace EnforceTest {
namespace {

using Enforce::NetPlan;
using Enforce::PlanNet;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr int kAbi = 4;

TEST(PlanNet, HandlesWhatHasRules) {
  const NetPlan plan =
      PlanNet(DomainOf({"-p connect_port 443 grant", "-p connect_port 80 82 grant",
                        "-p connect_port 81 revoke", "-p kill_signal 9 grant", "-s connect grant"}),
              kAbi);
  EXPECT_TRUE(plan.connect.isHandled);
  EXPECT_THAT(plan.connect.ports, ElementsAre(80, 82, 443));
  EXPECT_FALSE(plan.bind.isHandled);
  EXPECT_EQ(plan.fates.size(), 3U);
  EXPECT_THAT(Told(plan.fates),
              ElementsAre("narrowed: -p connect_port 443 grant (for TCP only)",
                          "narrowed: -p connect_port 80 82 grant (for TCP only)"));
}

TEST(PlanNet, HandlesPortsOfBothEnds) {
  const NetPlan plan =
      PlanNet(DomainOf({"-p bind_port 0 grant", "-p bind_port 65535 70000 grant"}), kAbi);
  EXPECT_TRUE(plan.bind.isHandled);
  EXPECT_THAT(plan.bind.ports, ElementsAre(0, 65535));
  EXPECT_FALSE(plan.connect.isHandled);
}

TEST(PlanNet, RefusesAllPortsWhereEachIsRevoked) {
  const NetPlan plan = PlanNet(DomainOf({"-p bind_port 0 65535 revoke"}), kAbi);
  EXPECT_TRUE(plan.bind.isHandled);
  EXPECT_THAT(plan.bind.ports, IsEmpty());
  EXPECT_THAT(Told(plan.fates), IsEmpty());
}

TEST(PlanNet, LeavesOpenWhatIsOpen) {
  for (const int abi : {0, kAbi}) {
    const NetPlan plan = PlanNet(
        DomainOf({"-p connect_port 0 65535 grant", "-p bind_port 65536 99999 revoke"}), abi);
    EXPECT_FALSE(plan.connect.isHandled);
    EXPECT_FALSE(plan.bind.isHandled);
    EXPECT_EQ(plan.fates.size(), 2U);
    EXPECT_THAT(Told(plan.fates), IsEmpty());
  }
}

TEST(PlanNet, CannotKeepPortsBeforeLandlockKnowsThem) {
  for (const int abi : {0, 1, 3}) {
    const NetPlan plan =
        PlanNet(DomainOf({"-p bind_port 80 grant", "-p bind_port 81 revoke"}), abi);
    EXPECT_FALSE(plan.bind.isHandled);
    EXPECT_THAT(
        Told(plan.fates),
        ElementsAre(
            "notExpressible: -p bind_port 80 grant (Landlock of this kernel knows no ports, "
            "which it does from Linux 6.7)",
            "notExpressible: -p bind_port 81 revoke (Landlock of this kernel knows no ports, "
            "which it does from Linux 6.7)"));
  }
}

TEST(PlanNet, CannotKeepMorePortsThanAreWorthTheirTime) {
  const NetPlan most = PlanNet(DomainOf({"-p connect_port 1 4096 grant"}), kAbi);
  EXPECT_TRUE(most.connect.isHandled);
  EXPECT_EQ(most.connect.ports.size(), 4096U);

  const NetPlan more = PlanNet(DomainOf({"-p connect_port 1 4097 grant"}), kAbi);
  EXPECT_FALSE(more.connect.isHandled);
  EXPECT_THAT(
      Told(more.fates),
      ElementsAre("notExpressible: -p connect_port 1 4097 grant (Landlock is told each port: "
                  "more than 4096 are too many)"));

  const NetPlan except =
      PlanNet(DomainOf({"-p bind_port 22 revoke", "-p connect_port 22 grant"}), kAbi);
  EXPECT_FALSE(except.bind.isHandled);
  EXPECT_TRUE(except.connect.isHandled);
  EXPECT_THAT(
      Told(except.fates),
      ElementsAre("notExpressible: -p bind_port 22 revoke (Landlock is told each port: more "
                  "than 4096 are too many)",
                  "narrowed: -p connect_port 22 grant (for TCP only)"));
}

}  // namespace
}  // namespace EnforceTest
