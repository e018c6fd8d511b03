// Loading and displaying tardisks: the policies first, the default always, one failure at the end.

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <string>

#include "labels/expected_reports.h"
#include "labels/file_system_faults.h"
#include "secpolicy/cached_domains.h"
#include "secpolicy/secpolicy.h"
#include "support/fixed_roots.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

constexpr char kPolicyDir[] = "/etc/zorvan/secpolicy/tardisks";
constexpr char kToolPolicy[] = "/etc/zorvan/secpolicy/tardisks/tool";
constexpr unsigned int kAppDom = 33;

const std::string kBackingAsked =
    "Sysinfo(1)\nSysinfo::AddInstancePath(\"/etc/zorvan/secpolicy/tardisks/tool\")\n"
    "Sysinfo::Get(548)\n~Sysinfo()";
const std::string kRead = kBackingAsked + "\nFindDomain(\"toolDom\")";
const std::string kParsed = ReportedInformation("Parsed all the tardisk policy files");
const std::string kToolLabelled =
    "LookupLabel(\"toolLabel\", OBJECT)\n"
    "SetXattr(\"/tardisks/tool.tgz\", \"zorvan.security\", 42, 4, 2)";
const std::string kToolApplied =
    kToolLabelled +
    "\nGetTardiskLaunchDomains()\nGetTardiskExecEventKeyword()\nFindDomain(\"hostDom\")\n"
    "SetDomTransRule({line: 1, domainId: 0, domainName: \"hostDom\", label: \"toolLabel\", "
    "targetDomain: \"toolDom\", targetDomainId: 7, transitionKind: \"tardisk_exec\", "
    "grant: true})";
const std::string kSet = ReportedInformation("Set all the tardisk labels and policy");
const std::string kDefaultInstalled =
    "GetDefaultTardiskLabel()\nGetDefaultTardiskDomain()\nGetTardiskLaunchDomains()\n"
    "GetTardiskExecEventKeyword()\nFindDomain(\"hostDom\")\n"
    "SetDomTransRule({line: 0, domainId: 0, domainName: \"hostDom\", label: \"tardiskDefault\", "
    "targetDomain: \"appDom\", targetDomainId: 33, transitionKind: \"tardisk_exec\", "
    "grant: true})";
const std::string kBaseLabelled =
    "LookupLabel(\"tardiskDefault\", OBJECT)\n"
    "SetXattr(\"/tardisks/base.tgz\", \"zorvan.security\", 3, 4, 2)";
constexpr char kFailed[] = "throws Braxo::Lib::BraxoException: Failure in setting tardisk policy";

// Two tardisks, of which one may bring a policy.
class TardiskLoaderTest : public FixedRootsTest {
 protected:
  TardiskLoaderTest() : cachedBefore(SecPolicy::GetDefaultTardiskDomain()) {
    SecPolicy::CacheDefaultTardiskDomain(kAppDom);
    host.domains[7].name = "toolDom";
    host.DeclareLabel("toolLabel", 42);
    host.tardiskLaunchDomains = {"hostDom"};
  }
  ~TardiskLoaderTest() override { SecPolicy::CacheDefaultTardiskDomain(cachedBefore); }

  void WriteToolPolicy(const FixedRoots& roots, const std::string& text) {
    roots.Write(kToolPolicy, text);
    host.SetTardisk(kToolPolicy, "tool.tgz");
  }
  Transcript Load() {
    return Record([&] { SecPolicy::LoadPolicyTardisks(kPolicyDir, access); });
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;

 private:
  const unsigned int cachedBefore;
};

using LoadPolicyTardisks = TardiskLoaderTest;

TEST_F(LoadPolicyTardisks, AppliesThePoliciesThenTheDefault) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {"/tardisks/tool.tgz", ""}});
  WriteToolPolicy(roots, "-E toolLabel toolDom\n");
  EXPECT_EQ(Load().Text(), Lines({
                               kBackingAsked,
                               kRead,
                               kParsed,
                               kToolApplied,
                               kSet,
                               kDefaultInstalled,
                               kBaseLabelled,
                               "returns",
                           }));
}

TEST_F(LoadPolicyTardisks, LabelsNothingWithoutAPolicyDirectory) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  EXPECT_EQ(Load().Text(), Lines({
                               ReportedInformation("Skipping tardisk policy as "
                                                   "/etc/zorvan/secpolicy/tardisks does not exist"),
                               kParsed,
                               kSet,
                               kDefaultInstalled,
                               "returns",
                           }));
}

TEST_F(LoadPolicyTardisks, IgnoresAPolicyFileFromNoTardisk) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  WriteToolPolicy(roots, "-E toolLabel toolDom\n");
  host.SetTardisk(kToolPolicy, "");
  EXPECT_EQ(Load().Text(), Lines({
                               kBackingAsked,
                               ReportedError("No backing tardisk for policy file "
                                             "/etc/zorvan/secpolicy/tardisks/tool"),
                               kParsed,
                               kSet,
                               kDefaultInstalled,
                               kBaseLabelled,
                               "returns",
                           }));
}

TEST_F(LoadPolicyTardisks, InstallsTheDefaultAlsoAfterABadPolicyFile) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {"/tardisks/tool.tgz", ""}});
  WriteToolPolicy(roots, "-E toolLabel toolDom\n-E otherLabel toolDom\n");
  EXPECT_EQ(Load().Text(), Lines({
                               kBackingAsked,
                               kRead,
                               ReportedError("Only one rule of this type is allowed"),
                               ReportedError("Error in parsing some tardisk policy files"),
                               kToolApplied,
                               kSet,
                               ReportedError("Failure in setting specified tardisk policy"),
                               kDefaultInstalled,
                               kBaseLabelled,
                               kFailed,
                           }));
}

TEST_F(LoadPolicyTardisks, InstallsTheDefaultAlsoAfterAPolicyThatCannotBeApplied) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {"/tardisks/tool.tgz", ""}});
  WriteToolPolicy(roots, "-E toolLabel toolDom\n");
  host.FailErrno("SetXattr", "/tardisks/tool.tgz", EROFS);
  EXPECT_EQ(Load().Text(),
            Lines({
                kBackingAsked,
                kRead,
                kParsed,
                kToolLabelled,
                ReportedError("/etc/zorvan/secpolicy/tardisks/tool:1 : Tardisk: "
                              "/tardisks/tool.tgz : Unable to set file label (toolLabel) for file "
                              "/tardisks/tool.tgz: Read-only file system"),
                ReportedError("Error in setting some tardisk labels and policy"),
                ReportedError("Failure in setting specified tardisk policy"),
                kDefaultInstalled,
                kBaseLabelled,
                kFailed,
            }));
}

TEST_F(LoadPolicyTardisks, ReportsADefaultThatFails) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {std::string(kPolicyDir) + "/", ""}});
  host.FailErrno("SetXattr", "/tardisks/base.tgz", ENODATA);
  EXPECT_EQ(Load().Text(), Lines({
                               kParsed,
                               kSet,
                               kDefaultInstalled,
                               kBaseLabelled,
                               ReportedError("Failed to set default tardisk label: "),
                               ReportedError("Unable to set file label (tardiskDefault) for file "
                                             "/tardisks/base.tgz: No data available"),
                               ReportedError("Failure in setting default tardisk policy"),
                               kFailed,
                           }));
}

TEST_F(LoadPolicyTardisks, ReportsAMissingLaunchDomain) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {std::string(kPolicyDir) + "/", ""}});
  host.tardiskLaunchDomains = {"noDom"};
  EXPECT_EQ(Load().Text(), Lines({
                               kParsed,
                               kSet,
                               "GetDefaultTardiskLabel()",
                               "GetDefaultTardiskDomain()",
                               "GetTardiskLaunchDomains()",
                               "GetTardiskExecEventKeyword()",
                               R"(FindDomain("noDom"))",
                               ReportedError("Failed to fetch domain id for noDom"),
                               kFailed,
                           }));
}

TEST_F(LoadPolicyTardisks, ThrowsOnceWhenThePoliciesAndTheDefaultFail) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {"/tardisks/tool.tgz", ""}});
  WriteToolPolicy(roots, "-X\n");
  host.FailWith("GetDefaultTardiskLabel", Every(), DerivedBraxoException("no default"));
  EXPECT_EQ(Load().Text(),
            Lines({
                kBackingAsked,
                kBackingAsked,
                ReportedError("Error in parsing policy for domain: "
                              "/etc/zorvan/secpolicy/tardisks/tool: 1 : invalid tardisk policy "
                              "rule type (-X)"),
                ReportedError("Error in parsing some tardisk policy files"),
                kSet,
                ReportedError("Failure in setting specified tardisk policy"),
                "GetDefaultTardiskLabel()",
                ReportedError("no default"),
                kFailed,
            }));
}

TEST_F(LoadPolicyTardisks, PassesAFailedDiscovery) {
  const FixedRoots roots({{kPolicyDir, "a file"}});
  EXPECT_EQ(Load().Text(), Lines({
                               "throws Braxo::Lib::BraxoException: Unable to open policy directory "
                               "for tardisks /etc/zorvan/secpolicy/tardisks",
                           }));
  std::filesystem::remove("/tardisks");
  EXPECT_EQ(Load().Text(),
            Lines({"throws Braxo::Lib::BraxoException: Could not open tardisk dir /tardisks/"}));
}

// The policies found before the failure are freed; a leak shows under the address sanitizer.
TEST_F(LoadPolicyTardisks, PassesAFailedDiscoveryHalfWay) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""},
                          {"/etc/zorvan/secpolicy/tardisks/one", ""},
                          {"/etc/zorvan/secpolicy/tardisks/two", ""}});
  host.SetTardisk("/etc/zorvan/secpolicy/tardisks/one", "one.tgz");
  host.SetTardisk("/etc/zorvan/secpolicy/tardisks/two", "two.tgz");
  const unsigned int openBefore = OpenDescriptors();
  host.FailWith("Sysinfo::Get", Nth(2), DerivedBraxoException("no record"));
  Transcript run = Load();
  EXPECT_EQ(run.exceptionType, "SecPolicyTest::DerivedBraxoException");
  EXPECT_EQ(run.exceptionText, "no record");
  EXPECT_EQ(run.Reports(), "throws SecPolicyTest::DerivedBraxoException: no record\n");

  host.FailForeign("Sysinfo::Get", Nth(5));
  run = Load();
  EXPECT_EQ(run.Reports(), "throws SecPolicyTest::ForeignException: foreign\n");
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

TEST_F(LoadPolicyTardisks, PassesForeignExceptionsOfGuardedSteps) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {"/tardisks/tool.tgz", ""}});
  WriteToolPolicy(roots, "-E toolLabel toolDom\n");
  host.FailForeign("GetDefaultTardiskDomain");
  EXPECT_EQ(Load().Text(), Lines({
                               kBackingAsked,
                               kRead,
                               kParsed,
                               kToolApplied,
                               kSet,
                               "GetDefaultTardiskLabel()",
                               "GetDefaultTardiskDomain()",
                               "throws SecPolicyTest::ForeignException: foreign",
                           }));
  host.FailForeign("FindDomain");
  EXPECT_EQ(Load().Text(), Lines({
                               kBackingAsked,
                               kRead,
                               "throws SecPolicyTest::ForeignException: foreign",
                           }));
}

TEST_F(LoadPolicyTardisks, IsLeftByAFailingReportOfAFailedStep) {
  const FixedRoots roots({{"/tardisks/tool.tgz", ""}});
  WriteToolPolicy(roots, "-X\n");
  host.syslogRunning = false;
  host.Fail("WriteToKlog", With(R"("Failure in setting specified tardisk policy", "[ERR]")"),
            "no log");
  const Transcript run = Load();
  EXPECT_EQ(run.trace.back(),
            R"(WriteToKlog("Failure in setting specified tardisk policy", "[ERR]"))");
  EXPECT_EQ(run.exceptionType, "Braxo::Lib::BraxoException");
  EXPECT_EQ(run.exceptionText, "no log");
}

// A report inside the guarded step fails the step like anything else in it.
TEST_F(LoadPolicyTardisks, TakesAFailingReportInsideAStepForAFailureOfTheStep) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {std::string(kPolicyDir) + "/", ""}});
  host.syslogRunning = false;
  host.Fail("WriteToKlog", Nth(1), "no log");
  EXPECT_EQ(Load().Text(), Lines({
                               R"(WriteToKlog("Parsed all the tardisk policy files", "[INFO]"))",
                               R"(stderr "Error: no log\n")",
                               R"(WriteToKlog("no log", "[ERR]"))",
                               kDefaultInstalled,
                               kBaseLabelled,
                               kFailed,
                           }));
}

// ---- Display.

const std::string kHeader = Lines({
    R"(stdout "\n")",
    R"(stdout "\n")",
    R"(stdout "--------------------\n")",
    R"(stdout "Tardisk Path (label)\n")",
    R"(stdout "--------------------\n")",
});

class DisplayPolicyTardiskLabels : public FixedRootsTest {
 protected:
  Transcript Display() {
    return Record([&] { SecPolicy::DisplayPolicyTardiskLabels(access); });
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
};

TEST_F(DisplayPolicyTardiskLabels, PrintsTheHeaderAloneWithoutTardisks) {
  const FixedRoots roots;
  EXPECT_EQ(Display().Text(), kHeader + "returns\n");
}

TEST_F(DisplayPolicyTardiskLabels, PrintsPathAndLabel) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  host.DeclareLabel("tardiskBaseLabel", 42);
  host.SetAttribute("/tardisks/base.tgz", 42);
  EXPECT_EQ(Display().Text(),
            kHeader + Lines({
                          R"(stdout unflushed "/tardisks/base.tgz (")",
                          R"(GetXattr("/tardisks/base.tgz", "zorvan.security", 4))",
                          R"(GetLabel(42, OBJECT))",
                          R"(stdout "tardiskBaseLabel)\n")",
                          "returns",
                      }));
  EXPECT_TRUE(host.StandardOutput().ends_with("\n/tardisks/base.tgz (tardiskBaseLabel)\n"));
}

TEST_F(DisplayPolicyTardiskLabels, LeavesTheLineOpenWhoseLabelCannotBeRead) {
  const FixedRoots roots(
      {{"/tardisks/a.tgz", ""}, {"/tardisks/b.tgz", ""}, {"/tardisks/c.tgz", ""}});
  const std::vector<std::string> names = ListingOrder("/tardisks");
  const std::string first = "/tardisks/" + names[0];
  const std::string second = "/tardisks/" + names[1];
  const std::string third = "/tardisks/" + names[2];
  host.FailErrno("GetXattr", second, ENODATA);
  EXPECT_EQ(Display().Text(),
            kHeader + Lines({
                          "stdout unflushed \"" + first + " (\"",
                          "GetXattr(\"" + first + R"(", "zorvan.security", 4))",
                          R"(GetLabel(2, OBJECT))",
                          R"(stdout "unlabeled)\n")",
                          "stdout unflushed \"" + second + " (\"",
                          "GetXattr(\"" + second + R"(", "zorvan.security", 4))",
                          ReportedError("Error in reading tardisk label: (" + second +
                                        "): Unable to get file label for file " + second +
                                        ":No data available"),
                          "stdout unflushed \"" + third + " (\"",
                          "GetXattr(\"" + third + R"(", "zorvan.security", 4))",
                          R"(GetLabel(2, OBJECT))",
                          R"(stdout "unlabeled)\n")",
                          "returns",
                      }));
  EXPECT_TRUE(host.StandardOutput().ends_with("\n" + first + " (unlabeled)\n" + second + " (" +
                                              third + " (unlabeled)\n"));
  EXPECT_EQ(host.StandardError(), "Error: Error in reading tardisk label: (" + second +
                                      "): Unable to get file label for file " + second +
                                      ":No data available\n");
}

TEST_F(DisplayPolicyTardiskLabels, ReportsALabelThatTheKernelDoesNotKnow) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  host.FailWith("GetLabel", Every(), DerivedBraxoException("no such label"));
  EXPECT_EQ(Display().Reports(),
            kHeader + Lines({
                          R"(stdout unflushed "/tardisks/base.tgz (")",
                          ReportedError("Error in reading tardisk label: (/tardisks/base.tgz): no "
                                        "such label"),
                          "returns",
                      }));
}

TEST_F(DisplayPolicyTardiskLabels, ReportsWhatIsNoTardiskBeforeTheFirst) {
  const FixedRoots roots({{"/tardisks/dir/", ""}, {"/tardisks/base.tgz", ""}});
  EXPECT_EQ(Display().Reports(), kHeader + Lines({
                                               ReportedError("Skipping directory dir"),
                                               R"(stdout unflushed "/tardisks/base.tgz (")",
                                               R"(stdout "unlabeled)\n")",
                                               "returns",
                                           }));
}

TEST_F(DisplayPolicyTardiskLabels, FailsAfterTheHeaderWithoutTheDirectory) {
  const FixedRoots roots;
  std::filesystem::remove("/tardisks");
  EXPECT_EQ(Display().Text(),
            kHeader + "throws Braxo::Lib::BraxoException: Could not open tardisk dir /tardisks/\n");
}

TEST_F(DisplayPolicyTardiskLabels, PassesForeignExceptions) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  host.FailForeign("GetLabel");
  EXPECT_EQ(Display().Reports(), kHeader + Lines({
                                               R"(stdout unflushed "/tardisks/base.tgz (")",
                                               "throws SecPolicyTest::ForeignException: foreign",
                                           }));
}

TEST_F(DisplayPolicyTardiskLabels, IsLeftByAFailingReport) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  host.syslogRunning = false;
  host.Fail("GetLabel", "no such label");
  host.Fail("WriteToKlog", "no log");
  const std::string message = "Error in reading tardisk label: (/tardisks/base.tgz): no such label";
  EXPECT_EQ(Display().Reports(), kHeader + Lines({
                                               R"(stdout unflushed "/tardisks/base.tgz (")",
                                               "stderr " + Quoted("Error: " + message + "\n"),
                                               "WriteToKlog(" + Quoted(message) + R"(, "[ERR]"))",
                                               "throws Braxo::Lib::BraxoException: no log",
                                           }));
}

}  // namespace
}  // namespace SecPolicyTest
