// A whole load: every call, message and flush in order; each part failing in turn; domains that a
// host cannot do without missing.

#include <csignal>
#include <cstdio>
#include <filesystem>
#include <memory>

#include "scenarios/good_host.h"
#include "secpolicy/cached_domains.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyTest {
namespace {

class LoadPolicy : public FixedRootsTest {
 protected:
  // The caches belong to the process.
  static void SetCaches(unsigned int id) {
    SecPolicy::CacheGlobalVMDomain(id);
    SecPolicy::CacheIOFilterDomain(id);
    SecPolicy::CacheDefaultTardiskDomain(id);
    SecPolicy::CacheDaemonFrameworkDomain(id);
  }

  static std::vector<unsigned int> Caches() {
    return {SecPolicy::GetGlobalVMDomain(), SecPolicy::GetIOFilterDomain(),
            SecPolicy::GetDefaultTardiskDomain(), SecPolicy::GetDaemonFrameworkDomain()};
  }

  static Transcript Load() {
    return Record([] { SecPolicy::LoadPolicy("/policy"); });
  }
};

TEST_F(LoadPolicy, InstallsTheWholeTree) {
  GoodHost good;
  EXPECT_EQ(Load().Text(), kFirstLoad.Text());
}

TEST_F(LoadPolicy, ReusesWhatAnEarlierLoadInstalled) {
  GoodHost good;
  LoadOnce(good.host);
  EXPECT_EQ(Load().Text(), kNextLoad.Text());
}

TEST_F(LoadPolicy, IsTheSameTheThirdTime) {
  GoodHost good;
  LoadOnce(good.host);
  Load();
  EXPECT_EQ(Load().Text(), kNextLoad.Text());
}

TEST_F(LoadPolicy, WritesNothingToStandardOutput) {
  GoodHost good;
  Load();
  EXPECT_EQ(good.host.StandardOutput(), "");
  EXPECT_EQ(good.host.StandardError(), "");
}

TEST_F(LoadPolicy, CachesTheWellKnownDomains) {
  GoodHost good;
  SetCaches(0);
  Load();
  EXPECT_EQ(Caches(), (std::vector<unsigned int>{5, 6, 3, 4}));
}

TEST_F(LoadPolicy, OverwritesTheCachesOfAnEarlierLoad) {
  GoodHost good;
  SetCaches(99);
  Load();
  EXPECT_EQ(Caches(), (std::vector<unsigned int>{5, 6, 3, 4}));
}

TEST_F(LoadPolicy, IgnoresTheResultsOfAnnouncingDomains) {
  GoodHost good;
  good.host.ReturnFalse("SetGlobalVMDomain");
  good.host.ReturnFalse("SetIoFilterDomain");
  good.host.ReturnFalse("SetDaemonFrameworkDomain");
  EXPECT_EQ(Load().Text(), kFirstLoad.Text());
}

TEST_F(LoadPolicy, ReportsToTheKernelLogWhileSyslogIsDown) {
  GoodHost good;
  good.host.syslogRunning = false;
  std::filesystem::remove_all("/policy/objects");
  const Transcript run = Load();
  EXPECT_EQ(run.trace[1], R"(WriteToKlog("Using policy dir /policy", "[INFO]"))");
  EXPECT_EQ(run.trace[2], R"(stderr "Error: Unable to open policy directory /policy/objects\n")");
  EXPECT_EQ(run.trace[3],
            R"(WriteToKlog("Unable to open policy directory /policy/objects", "[ERR]"))");
}

TEST_F(LoadPolicy, JoinsPathsWithoutNormalisingThem) {
  GoodHost good;
  good.host.DeclareWellKnownDomains();
  const Transcript run = Record([] { SecPolicy::LoadPolicy("/x/"); });
  EXPECT_EQ(run.Reports(), Informed("Using policy dir /x/") +
                               Reported("Unable to open policy directory /x//objects") +
                               Reported("Unable to open policy directory /x//domains") +
                               Informed("Parsed all domain names") +
                               Informed("Domain policies parsed and syntax validated") +
                               Informed("Constraints check for domain policies succeeded") +
                               Informed("Domain policies set") +
                               Informed("Parsed all the tardisk policy files") +
                               Informed("Set all the tardisk labels and policy") +
                               Reported("Unable to open policy directory /x//fileLabels") +
                               "throws Braxo::Lib::BraxoException: "
                               "There were some problems encountered in setting the policy\n");
}

// ---- Each loader failing in turn: reported once, all the others run, the load fails at the end.

TEST_F(LoadPolicy, GoesOnAfterFailedObjects) {
  GoodHost good;
  std::filesystem::remove_all("/policy/objects");
  LoadSections expected = kFirstLoad;
  expected.objects = Reported("Unable to open policy directory /policy/objects");
  expected.end = kFailed;
  EXPECT_EQ(Load().Text(), expected.Text());
}

TEST_F(LoadPolicy, GoesOnAfterAFailedTemplateDomain) {
  GoodHost good;
  good.host.Fail("SetFilePathAccessRules", "no room");
  LoadSections expected = kFirstLoad;
  expected.templateDomain += Reported("no room");
  expected.end = kFailed;
  EXPECT_EQ(Load().Text(), expected.Text());
}

TEST_F(LoadPolicy, GoesOnAfterFailedDomains) {
  GoodHost good;
  good.host.Fail("SetObjectAccessRule", Nth(2), "refused");
  LoadSections expected = kFirstLoad;
  expected.domains = WithoutLastLine(kFirstLoad.domains) +
                     Reported("Error in setting policy for domain: ioFilterDom: 1 : refused") +
                     Reported("Error in setting the policy for some domains") +
                     Reported("Failure in domain policy");
  expected.end = kFailed;
  EXPECT_EQ(Load().Text(), expected.Text());
}

TEST_F(LoadPolicy, GoesOnAfterFailedPartnerDomains) {
  GoodHost good;
  good.host.Fail("SetSyscallRule", Nth(3), "refused");
  LoadSections expected = kFirstLoad;
  expected.partners = WithoutLastLine(kFirstLoad.partners) +
                      Reported("Error in setting policy for domain: plugin-mon: 1 : refused") +
                      Reported("Error in setting the policy for some domains") +
                      Reported("Failure in domain policy");
  expected.end = kFailed;
  EXPECT_EQ(Load().Text(), expected.Text());
}

TEST_F(LoadPolicy, GoesOnAfterFailedTardisks) {
  GoodHost good;
  std::filesystem::remove_all("/tardisks");
  LoadSections expected = kFirstLoad;
  expected.tardisks = Reported("Could not open tardisk dir /tardisks/");
  expected.end = kFailed;
  EXPECT_EQ(Load().Text(), expected.Text());
}

TEST_F(LoadPolicy, FailsAfterFailedFileLabels) {
  GoodHost good;
  good.host.FailErrno("SetXattr", "/opt/log/today", ENODATA);
  LoadSections expected = kFirstLoad;
  expected.fileLabels =
      WithoutLastLine(kFirstLoad.fileLabels) +
      Reported(
          "/policy/fileLabels/tools:2 : Unable to set file label (logLabel) for file "
          "/opt/log/today: No data available") +
      Reported("There was a failure in setting file labels") +
      Reported("Error in setting some file labels.") + Reported("Failure in file labels policy");
  expected.end = kFailed;
  EXPECT_EQ(Load().Text(), expected.Text());
}

TEST_F(LoadPolicy, ThrowsOnceHoweverManyLoadersFailed) {
  GoodHost good;
  std::filesystem::remove_all("/policy/objects");
  std::filesystem::remove_all("/tardisks");
  std::filesystem::remove_all("/policy/fileLabels");
  LoadSections expected = kFirstLoad;
  expected.objects = Reported("Unable to open policy directory /policy/objects");
  expected.tardisks = Reported("Could not open tardisk dir /tardisks/");
  expected.fileLabels = Reported("Unable to open policy directory /policy/fileLabels");
  expected.end = kFailed;
  EXPECT_EQ(Load().Text(), expected.Text());
}

TEST_F(LoadPolicy, ReportsADerivedFailureByItsMessage) {
  GoodHost good;
  good.host.FailWith("SetFilePathAccessRules", Every(), DerivedBraxoException("no room"));
  LoadSections expected = kFirstLoad;
  expected.templateDomain += Reported("no room");
  expected.end = kFailed;
  EXPECT_EQ(Load().Text(), expected.Text());
}

TEST_F(LoadPolicy, EndsAtOnceAtAForeignException) {
  GoodHost good;
  good.host.FailForeign("SetFilePathAccessRules");
  EXPECT_EQ(Load().Text(), kFirstLoad.begin + kFirstLoad.objects + kFirstLoad.templateDomain +
                               kDone + "throws SecPolicyTest::ForeignException: foreign\n");
}

TEST_F(LoadPolicy, EndsAtOnceWhenMemoryRunsOut) {
  GoodHost good;
  good.host.FailWith("SetFilePathAccessRules", Every(), std::bad_alloc());
  EXPECT_EQ(Load().Text(), kFirstLoad.begin + kFirstLoad.objects + kFirstLoad.templateDomain +
                               kDone + "throws std::bad_alloc: std::bad_alloc\n");
}

// ---- Outside of every guard.

TEST_F(LoadPolicy, PassesOnAFailedConnection) {
  GoodHost good;
  good.host.Fail("TeskAccessInterfaceImpl", "no module");
  EXPECT_EQ(Load().Text(), Lines({
                               "TeskAccessInterfaceImpl()",
                               "throws Braxo::Lib::BraxoException: no module",
                           }));
}

TEST_F(LoadPolicy, PassesOnAFailedFirstReport) {
  GoodHost good;
  good.host.syslogRunning = false;
  good.host.Fail("WriteToKlog", Nth(1), "log full");
  EXPECT_EQ(Load().Text(), Lines({
                               "TeskAccessInterfaceImpl()",
                               R"(WriteToKlog("Using policy dir /policy", "[INFO]"))",
                               "~TeskAccessInterfaceImpl()",
                               "throws Braxo::Lib::BraxoException: log full",
                           }));
}

TEST_F(LoadPolicy, PassesOnAFailedErrorReport) {
  GoodHost good;
  std::filesystem::remove_all("/policy/objects");
  good.host.syslogRunning = false;
  good.host.Fail("WriteToKlog", Nth(2), "log full");
  EXPECT_EQ(Load().Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                R"(WriteToKlog("Using policy dir /policy", "[INFO]"))",
                R"(stderr "Error: Unable to open policy directory /policy/objects\n")",
                R"(WriteToKlog("Unable to open policy directory /policy/objects", "[ERR]"))",
                "~TeskAccessInterfaceImpl()",
                "throws Braxo::Lib::BraxoException: log full",
            }));
}

TEST_F(LoadPolicy, PassesOnAFailedLastReport) {
  GoodHost good;
  good.host.syslogRunning = false;
  good.host.Fail("WriteToKlog",
                 With(R"("System security policy has been set successfully", "[INFO]")"),
                 "log full");
  const Transcript run = Load();
  EXPECT_EQ(run.exceptionType, "Braxo::Lib::BraxoException");
  EXPECT_EQ(run.exceptionText, "log full");
  EXPECT_EQ(run.trace.back(), "~TeskAccessInterfaceImpl()");
}

struct WellKnownCall {
  std::string call;
  unsigned int nth;                  // of the calls of that name in the good load
  std::size_t lines;                 // of kWellKnown, up to the failing call
  std::vector<unsigned int> caches;  // afterwards, from 99

  friend void PrintTo(const WellKnownCall& fault, std::ostream* out) { *out << fault.call; }
};

class LoadPolicyWellKnownCall : public LoadPolicy,
                                public testing::WithParamInterface<WellKnownCall> {};

TEST_P(LoadPolicyWellKnownCall, IsNotGuarded) {
  const WellKnownCall& fault = GetParam();
  GoodHost good;
  SetCaches(99);
  good.host.Fail(fault.call, Nth(fault.nth), "refused");

  EXPECT_EQ(Load().Text(), kFirstLoad.UpToPartners() +
                               FirstLines(kFirstLoad.wellKnown, fault.lines) + kDone +
                               "throws Braxo::Lib::BraxoException: refused\n");
  EXPECT_EQ(Caches(), fault.caches);
}

// Eight domains are looked up before: the template twice, four policies, a target and a partner.
INSTANTIATE_TEST_SUITE_P(
    Calls, LoadPolicyWellKnownCall,
    testing::Values(WellKnownCall{"FindDomain", 9, 1, {99, 99, 99, 99}},
                    WellKnownCall{"SetGlobalVMDomain", 1, 2, {5, 99, 99, 99}},
                    WellKnownCall{"FindDomain", 10, 3, {5, 99, 99, 99}},
                    WellKnownCall{"SetIoFilterDomain", 1, 4, {5, 6, 99, 99}},
                    WellKnownCall{"FindDomain", 11, 5, {5, 6, 99, 99}},
                    WellKnownCall{"FindDomain", 12, 6, {5, 6, 3, 99}},
                    WellKnownCall{"SetDaemonFrameworkDomain", 1, 7, {5, 6, 3, 4}}),
    [](const auto& fault) { return fault.param.call + std::to_string(fault.param.nth); });

// ---- A well-known domain is missing.

struct MissingDomain {
  std::string name;
  std::string message;
  std::size_t lines;                 // of kWellKnown, up to its look-up
  std::vector<unsigned int> caches;  // afterwards, from 99

  friend void PrintTo(const MissingDomain& fault, std::ostream* out) { *out << fault.name; }
};

class LoadPolicyMissingDomainDeathTest : public LoadPolicy,
                                         public testing::WithParamInterface<MissingDomain> {
 protected:
  static std::string ExpectedTrace() {
    return kFirstLoad.UpToPartners() + FirstLines(kFirstLoad.wellKnown, GetParam().lines) +
           Reported(GetParam().message);
  }

  // Shows how far the load came when the process ends in the standard way, and clears up.
  [[noreturn]] static void ShowTraceAndAbort() {
    std::string text;
    for (const std::string& line : ScriptedHost::Current().trace.Lines()) text += line + "\n";
    std::fputs(text.c_str(), stderr);
    roots.reset();
    std::abort();
  }

  static void LoadWithout(const std::string& domain) {
    std::set_terminate(ShowTraceAndAbort);
    ScriptedHost host;
    roots = std::make_unique<GoodRoots>();
    ScriptGoodHost(host);
    host.hiddenDomains.insert(domain);
    SecPolicy::LoadPolicy("/policy");
  }

 private:
  inline static std::unique_ptr<GoodRoots> roots;
};

TEST_P(LoadPolicyMissingDomainDeathTest, EndsTheProcess) {
  EXPECT_EXIT(LoadWithout(GetParam().name), testing::KilledBySignal(SIGABRT),
              testing::Eq(ExpectedTrace()));
}

TEST_P(LoadPolicyMissingDomainDeathTest, RaisesTheExceptionThatTheCallerIsHandling) {
  GoodHost good;
  SetCaches(99);
  good.host.hiddenDomains.insert(GetParam().name);
  const Transcript run = Record([] {
    try {
      throw ForeignException("the caller's own");
    } catch (const ForeignException&) {
      SecPolicy::LoadPolicy("/policy");
    }
  });
  EXPECT_EQ(run.Text(),
            ExpectedTrace() + kDone + "throws SecPolicyTest::ForeignException: the caller's own\n");
  EXPECT_EQ(Caches(), GetParam().caches);
}

INSTANTIATE_TEST_SUITE_P(
    Domains, LoadPolicyMissingDomainDeathTest,
    testing::Values(
        MissingDomain{
            "globalVMDom", "Failed to fetch domainID for global VM Domain", 1, {99, 99, 99, 99}},
        MissingDomain{
            "ioFilterDom", "Failed to fetch domainID for IOFilter domain", 3, {5, 99, 99, 99}},
        MissingDomain{
            "appDom", "Failed to fetch domainID for default tar disk domain", 5, {5, 6, 99, 99}},
        MissingDomain{"daemonFrameworkDom",
                      "Failed to fetch domainID for daemon framework domain",
                      6,
                      {5, 6, 3, 99}}),
    [](const auto& domain) { return domain.param.name; });

}  // namespace
}  // namespace SecPolicyTest
