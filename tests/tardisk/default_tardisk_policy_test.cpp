// Tardisks that no policy claims: their transitions and label, and what a failing step keeps from
// the others.

#include <gtest/gtest.h>

#include <cerrno>
#include <list>
#include <string>

#include "labels/expected_reports.h"
#include "secpolicy/cached_domains.h"
#include "secpolicy/secpolicy.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

constexpr unsigned int kAppDom = 33;

// Host calls of installing the default, in order.
const std::string kFetched =
    "GetDefaultTardiskLabel()\nGetDefaultTardiskDomain()\nGetTardiskLaunchDomains()\n"
    "GetTardiskExecEventKeyword()";

std::string FoundDomain(const std::string& name) { return "FindDomain(" + Quoted(name) + ")"; }

std::string Installed(const std::string& launchDomain, unsigned int launchDomainId) {
  return "SetDomTransRule({line: 0, domainId: " + std::to_string(launchDomainId) +
         ", domainName: " + Quoted(launchDomain) +
         ", label: \"tardiskDefault\", targetDomain: \"appDom\", targetDomainId: 33, "
         "transitionKind: \"tardisk_exec\", grant: true})";
}

std::string Labelled(const std::string& path) {
  return "LookupLabel(\"tardiskDefault\", OBJECT)\nSetXattr(" + Quoted(path) +
         ", \"zorvan.security\", 3, 4, 2)";
}

class SetDefaultTardiskPolicy : public testing::Test {
 protected:
  SetDefaultTardiskPolicy() : cachedBefore(SecPolicy::GetDefaultTardiskDomain()) {
    SecPolicy::CacheDefaultTardiskDomain(kAppDom);
    host.domains[8].name = "daemonFrameworkDom";
  }
  ~SetDefaultTardiskPolicy() override { SecPolicy::CacheDefaultTardiskDomain(cachedBefore); }

  Transcript Set(std::list<std::string> tardisks) {
    return Record([&] { SecPolicy::SetDefaultTardiskPolicy(tardisks, access); });
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;

 private:
  const unsigned int cachedBefore;
};

TEST_F(SetDefaultTardiskPolicy, InstallsTransitionsThenLabels) {
  EXPECT_EQ(Set({"/tardisks/b.tgz", "/tardisks/a.tgz"}).Text(),
            Lines({
                kFetched,
                FoundDomain("hostDom"),
                Installed("hostDom", 0),
                FoundDomain("daemonFrameworkDom"),
                Installed("daemonFrameworkDom", 8),
                Labelled("/tardisks/b.tgz"),
                Labelled("/tardisks/a.tgz"),
                "returns",
            }));
}

TEST_F(SetDefaultTardiskPolicy, InstallsTransitionsWithoutTardisks) {
  EXPECT_EQ(Set({}).Text(), Lines({
                                kFetched,
                                FoundDomain("hostDom"),
                                Installed("hostDom", 0),
                                FoundDomain("daemonFrameworkDom"),
                                Installed("daemonFrameworkDom", 8),
                                "returns",
                            }));
}

TEST_F(SetDefaultTardiskPolicy, LabelsWithoutLaunchDomains) {
  host.tardiskLaunchDomains = {};
  EXPECT_EQ(Set({"/tardisks/a.tgz"}).Text(),
            Lines({kFetched, Labelled("/tardisks/a.tgz"), "returns"}));
}

TEST_F(SetDefaultTardiskPolicy, TakesLabelDomainAndKeywordFromTheHost) {
  host.DeclareLabel("plain", 21);
  host.defaultTardiskLabel = "plain";
  host.defaultTardiskDomain = "otherDom";
  host.tardiskExecEventKeyword = "launch";
  host.tardiskLaunchDomains = {"hostDom"};
  EXPECT_EQ(Set({"/tardisks/a.tgz"}).Text(),
            Lines({
                kFetched,
                FoundDomain("hostDom"),
                R"(SetDomTransRule({line: 0, domainId: 0, domainName: "hostDom", label: "plain", )"
                R"(targetDomain: "otherDom", targetDomainId: 33, transitionKind: "launch", )"
                R"(grant: true}))",
                R"(LookupLabel("plain", OBJECT))",
                R"(SetXattr("/tardisks/a.tgz", "zorvan.security", 21, 4, 2))",
                "returns",
            }));
}

TEST_F(SetDefaultTardiskPolicy, InstallsNoTransitionOfTheDefaultDomainIntoItself) {
  host.domains[kAppDom].name = "appDom";
  host.tardiskLaunchDomains = {"appDom", "hostDom"};
  EXPECT_EQ(Set({}).Text(), Lines({
                                kFetched,
                                FoundDomain("appDom"),
                                FoundDomain("hostDom"),
                                Installed("hostDom", 0),
                                "returns",
                            }));
}

// The cached identifier counts, not the name.
TEST_F(SetDefaultTardiskPolicy, InstallsATransitionOfADomainThatIsOnlyCalledLikeTheDefault) {
  host.domains[34].name = "appDom";
  host.tardiskLaunchDomains = {"appDom"};
  EXPECT_EQ(Set({}).Text(),
            Lines({kFetched, FoundDomain("appDom"), Installed("appDom", 34), "returns"}));
}

TEST_F(SetDefaultTardiskPolicy, SkipsTheStartDomainBeforeAnyLoad) {
  SecPolicy::CacheDefaultTardiskDomain(0);
  host.tardiskLaunchDomains = {"hostDom"};
  EXPECT_EQ(Set({}).Text(), Lines({kFetched, FoundDomain("hostDom"), "returns"}));
}

TEST_F(SetDefaultTardiskPolicy, StopsAtAMissingLaunchDomainBeforeAnyLabel) {
  host.tardiskLaunchDomains = {"hostDom", "noDom", "daemonFrameworkDom"};
  EXPECT_EQ(Set({"/tardisks/a.tgz"}).Text(),
            Lines({
                kFetched,
                FoundDomain("hostDom"),
                Installed("hostDom", 0),
                FoundDomain("noDom"),
                "throws Braxo::Lib::BraxoException: Failed to fetch domain id for noDom",
            }));
}

TEST_F(SetDefaultTardiskPolicy, PassesAFailingLookupOfALaunchDomain) {
  host.FailWith("FindDomain", Every(), DerivedBraxoException("no table"));
  EXPECT_EQ(Set({"/tardisks/a.tgz"}).Text(),
            Lines({
                kFetched,
                FoundDomain("hostDom"),
                "throws SecPolicyTest::DerivedBraxoException: no table",
            }));
}

TEST_F(SetDefaultTardiskPolicy, GoesOnAfterATransitionThatIsRefused) {
  host.Fail("SetDomTransRule", Nth(1), "table full");
  EXPECT_EQ(Set({"/tardisks/a.tgz"}).Text(),
            Lines({
                kFetched,
                FoundDomain("hostDom"),
                Installed("hostDom", 0),
                ReportedError("Failed to set default tardisk rule: "),
                ReportedError("table full"),
                FoundDomain("daemonFrameworkDom"),
                Installed("daemonFrameworkDom", 8),
                Labelled("/tardisks/a.tgz"),
                "throws Braxo::Lib::BraxoException: Failure in setting default tardisk policy",
            }));
}

TEST_F(SetDefaultTardiskPolicy, GoesOnAfterALabelThatCannotBeSet) {
  host.tardiskLaunchDomains = {};
  host.FailErrno("SetXattr", "/tardisks/a.tgz", ENODATA);
  EXPECT_EQ(
      Set({"/tardisks/a.tgz", "/tardisks/b.tgz"}).Text(),
      Lines({
          kFetched,
          Labelled("/tardisks/a.tgz"),
          ReportedError("Failed to set default tardisk label: "),
          ReportedError("Unable to set file label (tardiskDefault) for file /tardisks/a.tgz: No "
                        "data available"),
          Labelled("/tardisks/b.tgz"),
          "throws Braxo::Lib::BraxoException: Failure in setting default tardisk policy",
      }));
}

TEST_F(SetDefaultTardiskPolicy, ReportsEveryTardiskWhenTheDefaultLabelDoesNotExist) {
  host.tardiskLaunchDomains = {};
  host.DeclareLabel("tardiskDefault", 1);
  EXPECT_EQ(Set({"/tardisks/a.tgz", "/tardisks/b.tgz"}).Text(),
            Lines({
                kFetched,
                R"(LookupLabel("tardiskDefault", OBJECT))",
                ReportedError("Failed to set default tardisk label: "),
                ReportedError("Invalid label (tardiskDefault) for file /tardisks/a.tgz"),
                R"(LookupLabel("tardiskDefault", OBJECT))",
                ReportedError("Failed to set default tardisk label: "),
                ReportedError("Invalid label (tardiskDefault) for file /tardisks/b.tgz"),
                "throws Braxo::Lib::BraxoException: Failure in setting default tardisk policy",
            }));
}

TEST_F(SetDefaultTardiskPolicy, IsLeftByAFailingReport) {
  host.tardiskLaunchDomains = {"hostDom"};
  host.syslogRunning = false;
  host.Fail("SetDomTransRule", "table full");
  host.Fail("WriteToKlog", "no log");
  EXPECT_EQ(Set({"/tardisks/a.tgz"}).Text(),
            Lines({
                kFetched,
                FoundDomain("hostDom"),
                Installed("hostDom", 0),
                R"(stderr "Error: Failed to set default tardisk rule: \n")",
                R"(WriteToKlog("Failed to set default tardisk rule: ", "[ERR]"))",
                "throws Braxo::Lib::BraxoException: no log",
            }));
}

TEST_F(SetDefaultTardiskPolicy, IsLeftByAFailingReportOfALabel) {
  host.tardiskLaunchDomains = {};
  host.syslogRunning = false;
  host.Fail("LookupLabel", "no table");
  host.Fail("WriteToKlog", Nth(2), "no log");
  EXPECT_EQ(Set({"/tardisks/a.tgz", "/tardisks/b.tgz"}).Text(),
            Lines({
                kFetched,
                R"(LookupLabel("tardiskDefault", OBJECT))",
                R"(stderr "Error: Failed to set default tardisk label: \n")",
                R"(WriteToKlog("Failed to set default tardisk label: ", "[ERR]"))",
                R"(stderr "Error: no table\n")",
                R"(WriteToKlog("no table", "[ERR]"))",
                "throws Braxo::Lib::BraxoException: no log",
            }));
}

// The calls whose failures nothing catches.
class SetDefaultTardiskPolicyHostCall : public SetDefaultTardiskPolicy,
                                        public testing::WithParamInterface<const char*> {};

TEST_P(SetDefaultTardiskPolicyHostCall, PassesWhateverItThrows) {
  EXPECT_EQ(Set({"/tardisks/a.tgz"}).exceptionType, "");

  host.FailWith(GetParam(), Every(), DerivedBraxoException("refused"));
  Transcript run = Set({"/tardisks/a.tgz"});
  EXPECT_TRUE(run.trace.back().starts_with(GetParam())) << run.Text();
  EXPECT_EQ(run.exceptionType, "SecPolicyTest::DerivedBraxoException");
  EXPECT_EQ(run.exceptionText, "refused");

  host.FailForeign(GetParam());
  run = Set({"/tardisks/a.tgz"});
  EXPECT_TRUE(run.trace.back().starts_with(GetParam())) << run.Text();
  EXPECT_EQ(run.exceptionType, "SecPolicyTest::ForeignException");
}

INSTANTIATE_TEST_SUITE_P(Unguarded, SetDefaultTardiskPolicyHostCall,
                         testing::Values("GetDefaultTardiskLabel", "GetDefaultTardiskDomain",
                                         "GetTardiskLaunchDomains", "GetTardiskExecEventKeyword",
                                         "FindDomain"),
                         [](const auto& call) { return std::string(call.param); });

TEST_F(SetDefaultTardiskPolicy, PassesForeignExceptionsOfGuardedSteps) {
  host.FailForeign("LookupLabel");
  host.tardiskLaunchDomains = {"hostDom"};
  EXPECT_EQ(Set({"/tardisks/a.tgz"}).Text(), Lines({
                                                 kFetched,
                                                 FoundDomain("hostDom"),
                                                 Installed("hostDom", 0),
                                                 R"(LookupLabel("tardiskDefault", OBJECT))",
                                                 "throws SecPolicyTest::ForeignException: foreign",
                                             }));
  host.FailForeign("SetDomTransRule");
  EXPECT_EQ(Set({"/tardisks/a.tgz"}).Text(), Lines({
                                                 kFetched,
                                                 FoundDomain("hostDom"),
                                                 Installed("hostDom", 0),
                                                 "throws SecPolicyTest::ForeignException: foreign",
                                             }));
}

}  // namespace
}  // namespace SecPolicyTest
