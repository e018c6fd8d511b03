// What an observer is told of whole loads, and that being observed changes nothing of them.

#include <gmock/gmock.h>

#include "observed/observer_log.h"
#include "scenarios/good_host.h"
#include "secpolicy/observed/loading.h"

namespace SecPolicyTest {
namespace {

constexpr char kTardiskPolicy[] = "/etc/zorvan/secpolicy/tardisks/base";

class ObservedWholeLoad : public FixedRootsTest {
 protected:
  Transcript Load() {
    return Record([this] { SecPolicy::LoadPolicy("/policy", log); });
  }

  ObserverLog log;
};

TEST_F(ObservedWholeLoad, IsTheLoadThatNobodyObserves) {
  GoodHost good;
  EXPECT_EQ(Load().Text(), kFirstLoad.Text());
}

TEST_F(ObservedWholeLoad, TellsPhasesAndWhatWasReadAndInstalled) {
  GoodHost good;
  Load();
  EXPECT_EQ(
      log.lines,
      (std::vector<std::string>{
          "end objects", "path /vm of globalVMDom:1", "end domains", "end partner domains",
          "label toolLabel of /tardisks/base.tgz from " + std::string(kTardiskPolicy) + ":1",
          "transition hostDom toolLabel globalVMDom from " + std::string(kTardiskPolicy) + ":1",
          "transition daemonFrameworkDom toolLabel globalVMDom from " +
              std::string(kTardiskPolicy) + ":1",
          "end tardisks", "label toolLabel of /opt/tool/run from /policy/fileLabels/tools:1",
          "label logLabel of /opt/log/* from /policy/fileLabels/tools:2", "end file labels"}));
}

TEST_F(ObservedWholeLoad, TellsPhasesOfAnEarlyLoad) {
  GoodHost good;
  const Transcript run = Record([this] { SecPolicy::LoadPolicyEarly("/early", log); });
  EXPECT_EQ(run.Text(), kEarlyLoad.Text());
  EXPECT_EQ(log.lines, (std::vector<std::string>{"end objects", "end domains",
                                                 "label earlyLabel of /opt/early from "
                                                 "/etc/zorvan/secpolicy/fileLabels/base:1",
                                                 "end file labels"}));
}

// The handler that a caller is in gets its exception back.
TEST_F(ObservedWholeLoad, TellsWhichDomainIsMissing) {
  GoodHost good;
  good.host.hiddenDomains = {"ioFilterDom"};
  try {
    throw 42;
  } catch (int) {
    EXPECT_EQ(Load().exceptionType, "int");
  }
  EXPECT_EQ(log.lines.at(log.lines.size() - 2), "missing ioFilterDom");
  EXPECT_EQ(log.lines.back(), "error Failed to fetch domainID for IOFilter domain");
}

TEST_F(ObservedWholeLoad, TellsWhichFileADomainThatCannotBeMadeIsOf) {
  GoodHost good;
  good.host.Fail("CreateDomain", "no slot is left");
  TeskAccessInterfaceImpl access;
  Record([&] { SecPolicy::LoadPolicyDomains("/policy/domains", access, log); });
  EXPECT_EQ(log.Problems(),
            std::vector<std::string>{"problem /policy/domains/appDom:0 no slot is left"});
}

TEST_F(ObservedWholeLoad, TellsWhyObjectsCannotBeDefined) {
  GoodHost good;
  good.host.Fail("GetInvalidLabels", Nth(1), "no table");
  Load();
  EXPECT_THAT(log.Problems(), ::testing::Contains("problem /policy/objects:0 no table"));
}

TEST_F(ObservedWholeLoad, TellsEveryErrorThatIsWritten) {
  GoodHost good;
  good.roots.Write("/policy/objects/bad", "two words\n");
  good.roots.Write("/policy/domains/badDom", "-x\n");
  good.roots.Write("/policy/fileLabels/bad", "/one\n");
  good.roots.Write("/tardisks/directory/", "");
  Load();
  std::string errors;
  for (const std::string& line : log.lines) {
    if (line.starts_with("error ")) errors += "Error: " + line.substr(6) + "\n";
  }
  EXPECT_EQ(errors, good.host.StandardError());
  EXPECT_EQ(log.Problems().size(), 3u);
}

TEST_F(ObservedWholeLoad, TellsTheErrorsOfARestoreAndADisplay) {
  GoodHost good;
  LoadOnce(good.host);
  good.host.Fail("GetMaxDomains", Nth(1), "no slots");
  good.host.Fail("GetSyscallRules", Nth(1), "no rules");
  SecPolicy::RestoreDomainEnforcement(log);
  SecPolicy::DisplayPolicy("0", log);
  EXPECT_EQ(log.lines, (std::vector<std::string>{"error no slots", "error no rules"}));
}

}  // namespace
}  // namespace SecPolicyTest
