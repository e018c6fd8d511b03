// The early load, the restore of levels and the display, whole: what each shows, and where each
// ends when a part fails.

#include <filesystem>

#include "scenarios/good_host.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyTest {
namespace {

// ---- Early load.

class LoadPolicyEarly : public FixedRootsTest {
 protected:
  static Transcript Load() {
    return Record([] { SecPolicy::LoadPolicyEarly("/early"); });
  }
};

TEST_F(LoadPolicyEarly, TakesOnlyTheDomainsFromItsDirectory) {
  GoodHost good;
  EXPECT_EQ(Load().Text(), kEarlyLoad.Text());
}

TEST_F(LoadPolicyEarly, LeavesTheCachesAlone) {
  GoodHost good;
  SecPolicy::LoadPolicy("/policy");
  Load();
  EXPECT_EQ(SecPolicy::GetGlobalVMDomain(), 5u);
  EXPECT_EQ(SecPolicy::GetDaemonFrameworkDomain(), 4u);
}

TEST_F(LoadPolicyEarly, StopsAfterFailedObjects) {
  GoodHost good;
  std::filesystem::remove_all("/etc/zorvan/secpolicy/objects");
  EXPECT_EQ(Load().Text(),
            kEarlyLoad.begin + kDone +
                Reported("Unable to open policy directory /etc/zorvan/secpolicy/objects") +
                "returns\n");
}

TEST_F(LoadPolicyEarly, StopsAfterFailedDomains) {
  GoodHost good;
  std::filesystem::remove_all("/early/domains");
  EXPECT_EQ(Load().Text(), kEarlyLoad.begin + kEarlyLoad.objects + kDone +
                               Reported("Unable to open policy directory /early/domains") +
                               "returns\n");
}

TEST_F(LoadPolicyEarly, ReturnsAfterFailedFileLabels) {
  GoodHost good;
  std::filesystem::remove_all("/etc/zorvan/secpolicy/fileLabels");
  EXPECT_EQ(Load().Text(),
            kEarlyLoad.begin + kEarlyLoad.objects + kEarlyLoad.domains + kDone +
                Reported("Unable to open policy directory /etc/zorvan/secpolicy/fileLabels") +
                "returns\n");
}

TEST_F(LoadPolicyEarly, ReportsAFailedConnection) {
  GoodHost good;
  good.host.Fail("TeskAccessInterfaceImpl", "no module");
  EXPECT_EQ(Load().Text(), "TeskAccessInterfaceImpl()\n" + Reported("no module") + "returns\n");
}

TEST_F(LoadPolicyEarly, ReportsAFailedFirstReport) {
  GoodHost good;
  good.host.syslogRunning = false;
  good.host.Fail("WriteToKlog", Nth(1), "log full");
  EXPECT_EQ(Load().Text(), Lines({
                               "TeskAccessInterfaceImpl()",
                               R"(WriteToKlog("Using early policy dir /early", "[INFO]"))",
                               "~TeskAccessInterfaceImpl()",
                               R"(stderr "Error: log full\n")",
                               R"(WriteToKlog("log full", "[ERR]"))",
                               "returns",
                           }));
}

TEST_F(LoadPolicyEarly, PassesOnAFailedErrorReport) {
  GoodHost good;
  good.host.syslogRunning = false;
  good.host.Fail("WriteToKlog", "log full");
  EXPECT_EQ(Load().Text(), Lines({
                               "TeskAccessInterfaceImpl()",
                               R"(WriteToKlog("Using early policy dir /early", "[INFO]"))",
                               "~TeskAccessInterfaceImpl()",
                               R"(stderr "Error: log full\n")",
                               R"(WriteToKlog("log full", "[ERR]"))",
                               "throws Braxo::Lib::BraxoException: log full",
                           }));
}

TEST_F(LoadPolicyEarly, PassesOnAForeignException) {
  GoodHost good;
  good.host.FailForeign("GetKeywordsMap");
  EXPECT_EQ(Load().Text(), kEarlyLoad.begin + FirstLines(kEarlyLoad.objects, 2) + kDone +
                               "throws SecPolicyTest::ForeignException: foreign\n");
}

TEST_F(LoadPolicyEarly, PassesOnAForeignExceptionOfTheConnection) {
  GoodHost good;
  good.host.FailForeign("TeskAccessInterfaceImpl");
  EXPECT_EQ(Load().Text(), Lines({
                               "TeskAccessInterfaceImpl()",
                               "throws SecPolicyTest::ForeignException: foreign",
                           }));
}

// ---- Restore of enforcement levels. It reads no files, so it needs no roots.

constexpr char kRestoring[] = R"(TeskAccessInterfaceImpl()
syslog(LOG_INFO, "%s", "Restoring domain enforcement")
GetMaxDomains()
)";

// Slot 1 holds nothing, and nothing is stored for slot 3.
class SettledHost {
 public:
  SettledHost() {
    host.domains[2].name = "globalVMDom";
    host.domains[3].name = "appDom";
    host.storedObjects[{"domain_settings", "security", "orin", "hostDom"}] = {
        {"enforcement_level", "PERMISSIVE"}};
    host.storedObjects[{"domain_settings", "security", "orin", "globalVMDom"}] = {};
  }

  static Transcript Restore() {
    return Record([] { SecPolicy::RestoreDomainEnforcement(); });
  }

  ScriptedHost host;
};

TEST(RestoreDomainEnforcementEntry, AppliesWhatIsStored) {
  SettledHost settled;
  EXPECT_EQ(settled.Restore().Text(),
            kRestoring + Lines({
                             R"(GetCompleteDomainInfo(0))",
                             R"(GetDesiredUserConfig({"domain_settings", "security", "orin", )"
                             R"("hostDom"}, 0))",
                             R"(StoreObject::GetValue("enforcement_level"))",
                             R"(EnableDomain("hostDom", "permissive", false))",
                             R"(SetBootStatus({"domain_settings", "security", "orin", )"
                             R"("hostDom"}, true))",
                             R"(GetCompleteDomainInfo(1))",
                             R"(GetCompleteDomainInfo(2))",
                             R"(GetDesiredUserConfig({"domain_settings", "security", "orin", )"
                             R"("globalVMDom"}, 0))",
                             R"(StoreObject::GetValue("enforcement_level"))",
                             R"(EnableDomain("globalVMDom", "", false))",
                             R"(SetBootStatus({"domain_settings", "security", "orin", )"
                             R"("globalVMDom"}, true))",
                             R"(GetCompleteDomainInfo(3))",
                             R"(GetDesiredUserConfig({"domain_settings", "security", "orin", )"
                             R"("appDom"}, 0))",
                             "~TeskAccessInterfaceImpl()",
                             "returns",
                         }));
}

TEST(RestoreDomainEnforcementEntry, ReportsAFailureAndReturns) {
  SettledHost settled;
  settled.host.Fail("EnableDomain", "unknown level");
  EXPECT_EQ(
      settled.Restore().Text(),
      kRestoring +
          Lines({
              R"(GetCompleteDomainInfo(0))",
              R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "hostDom"}, 0))",
              R"(StoreObject::GetValue("enforcement_level"))",
              R"(EnableDomain("hostDom", "permissive", false))",
              "~TeskAccessInterfaceImpl()",
          }) +
          Reported("unknown level") + "returns\n");
}

TEST(RestoreDomainEnforcementEntry, ReportsAFailedConnection) {
  SettledHost settled;
  settled.host.Fail("TeskAccessInterfaceImpl", "no module");
  EXPECT_EQ(settled.Restore().Text(),
            "TeskAccessInterfaceImpl()\n" + Reported("no module") + "returns\n");
}

TEST(RestoreDomainEnforcementEntry, ReportsAFailedFirstReport) {
  SettledHost settled;
  settled.host.syslogRunning = false;
  settled.host.Fail("WriteToKlog", Nth(1), "log full");
  EXPECT_EQ(settled.Restore().Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                R"(WriteToKlog("Restoring domain enforcement", "[INFO]"))",
                "~TeskAccessInterfaceImpl()",
                R"(stderr "Error: log full\n")",
                R"(WriteToKlog("log full", "[ERR]"))",
                "returns",
            }));
}

TEST(RestoreDomainEnforcementEntry, PassesOnAForeignException) {
  SettledHost settled;
  settled.host.FailForeign("GetMaxDomains");
  EXPECT_EQ(settled.Restore().Text(),
            kRestoring + kDone + "throws SecPolicyTest::ForeignException: foreign\n");
}

// ---- Display.

constexpr char kConnected[] = "TeskAccessInterfaceImpl()\n";

class DisplayPolicy : public FixedRootsTest {
 protected:
  // One tardisk is left: two are shown in whatever order the directory gives them.
  struct LoadedHost : GoodHost {
    LoadedHost() {
      LoadOnce(host);
      std::filesystem::remove("/tardisks/extra.tgz");
    }
  };

  static Transcript Display(const std::string& domain) {
    return Record([&] { SecPolicy::DisplayPolicy(domain); });
  }
};

TEST_F(DisplayPolicy, ShowsDomainsThenObjectsThenTardisks) {
  LoadedHost loaded;
  EXPECT_EQ(Display("").Text(), kConnected + DisplayedDomains() + DisplayedObjects() +
                                    DisplayedTardisks() + kDone + "returns\n");
}

TEST_F(DisplayPolicy, ShowsAWholeDomainAsItsPolicyLines) {
  LoadedHost loaded;
  Display("5");
  EXPECT_EQ(loaded.host.StandardOutput(), R"(

------------------------
Policy set in the kernel
------------------------


------------------------------------------------------------------
Domain Name: globalVMDom Domain ID :5 Enforcement Level: enforcing
State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0
------------------------------------------------------------------
-a toolLabel read grant


-c cap_chown revoke


-d toolLabel supportDom exec grant


-f toolLabel logLabel regular grant


-p bind_port 80 443 grant


-r /vm rw


-s read grant


-u logLabel stream revoke





---------------------------------
Objects Defined: Name (Kernel Id)
---------------------------------
logLabel (5)
tardiskDefault (3)
toolLabel (4)
unlabeled (2)


--------------------
Tardisk Path (label)
--------------------
/tardisks/base.tgz (toolLabel)
)");
  EXPECT_EQ(loaded.host.StandardError(), "");
}

TEST_F(DisplayPolicy, ShowsOnlyTheSlotThatIsAskedFor) {
  LoadedHost loaded;
  EXPECT_EQ(Display("4").Text(), kConnected + PrintedHeader("Policy set in the kernel", "") +
                                     DisplayedDomain(4) + DisplayedObjects() + DisplayedTardisks() +
                                     kDone + "returns\n");
}

TEST_F(DisplayPolicy, PassesOnAFailedConnection) {
  LoadedHost loaded;
  loaded.host.Fail("TeskAccessInterfaceImpl", "no module");
  EXPECT_EQ(Display("").Text(), Lines({
                                    "TeskAccessInterfaceImpl()",
                                    "throws Braxo::Lib::BraxoException: no module",
                                }));
}

TEST_F(DisplayPolicy, StopsAfterFailedDomains) {
  LoadedHost loaded;
  loaded.host.Fail("GetMaxDomains", "no table");
  EXPECT_EQ(Display("").Text(), kConnected + PrintedHeader("Policy set in the kernel", "") +
                                    "GetMaxDomains()\n" + kDone +
                                    "throws Braxo::Lib::BraxoException: no table\n");
}

TEST_F(DisplayPolicy, StopsAfterFailedObjects) {
  LoadedHost loaded;
  loaded.host.Fail("GetKeywordsMap", "no table");
  EXPECT_EQ(Display("").Text(), kConnected + DisplayedDomains() +
                                    PrintedHeader("Objects Defined: Name (Kernel Id)", "") +
                                    "GetKeywordsMap(LABEL)\n" + kDone +
                                    "throws Braxo::Lib::BraxoException: no table\n");
}

TEST_F(DisplayPolicy, StopsAfterFailedTardisks) {
  LoadedHost loaded;
  std::filesystem::remove_all("/tardisks");
  EXPECT_EQ(Display("").Text(),
            kConnected + DisplayedDomains() + DisplayedObjects() +
                PrintedHeader("Tardisk Path (label)", "") + kDone +
                "throws Braxo::Lib::BraxoException: Could not open tardisk dir /tardisks/\n");
}

TEST_F(DisplayPolicy, PassesOnAForeignException) {
  LoadedHost loaded;
  loaded.host.FailForeign("GetKeywordsMap");
  EXPECT_EQ(Display("").Text(), kConnected + DisplayedDomains() +
                                    PrintedHeader("Objects Defined: Name (Kernel Id)", "") +
                                    "GetKeywordsMap(LABEL)\n" + kDone +
                                    "throws SecPolicyTest::ForeignException: foreign\n");
}

}  // namespace
}  // namespace SecPolicyTest
