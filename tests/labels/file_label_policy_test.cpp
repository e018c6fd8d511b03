// Lines of file labels: which are read, in which order they are applied, what a bad line or a file
// that cannot be labelled ends, and what it does not.

#include "secpolicy/labels/file_label_policy.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <string>
#include <vector>

#include "labels/expected_reports.h"
#include "labels/file_system_faults.h"
#include "secpolicy/secpolicy.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using SecPolicy::FileLabelPolicy;

class FileLabelPolicyTest : public testing::Test {
 protected:
  FileLabelPolicyTest() {
    host.DeclareLabel("toolLabel", 42);
    host.DeclareLabel("baseLabel", 43);
  }

  Transcript Parse(const std::string& file) {
    return Record([&] { policy.ParsePolicy(file, access); });
  }
  // Parses a file "labels" with this text.
  Transcript ParseText(const std::string& text) {
    tree.Write("labels", text);
    return Parse(tree / "labels");
  }
  Transcript Apply() {
    return Record([&] { policy.SetFileLabels(access); });
  }
  Transcript Load(const std::string& dir) {
    return Record([&] { SecPolicy::LoadPolicyFileLabels(dir, access); });
  }

  // The records, one line each: "path label recursive policyFile lineNumber".
  std::string Records() const {
    std::string text;
    for (const auto& [path, label, recursive, policyFile, lineNumber] : policy.fileLabels) {
      text += Quoted(path) + " " + label + (recursive ? " tree " : " entry ") + policyFile + ":" +
              std::to_string(lineNumber) + "\n";
    }
    return text;
  }

  // How the refusal of a line of the file "labels" ends.
  std::string Refused(unsigned int line, const std::string& message) const {
    return "throws Braxo::Lib::BraxoException: " + tree / "labels" + ":" + std::to_string(line) +
           " : " + message;
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  PolicyTree tree;
  FileLabelPolicy policy;
};

using FileLabelPolicyParsePolicy = FileLabelPolicyTest;
using FileLabelPolicySetFileLabels = FileLabelPolicyTest;
using LoadPolicyFileLabels = FileLabelPolicyTest;

std::string Validated(const std::string& label) {
  return "ValidateKeyword(LABEL, " + Quoted(label) + ")";
}

// The host calls that give `path` the label `label`.
std::string Labelled(const std::string& path, const std::string& label) {
  return "LookupLabel(" + Quoted(label) + ", OBJECT)\nSetXattr(" + Quoted(path) +
         ", \"zorvan.security\", " + (label == "toolLabel" ? "42" : "43") + ", 4, 2)";
}

TEST(FileLabelPolicyShape, IsTheQueueOfRecordsAndNothingElse) {
  EXPECT_EQ(sizeof(FileLabelPolicy), sizeof(std::deque<FileLabelPolicy::FileLabel>));
  EXPECT_FALSE(std::is_polymorphic_v<FileLabelPolicy>);
}

// ---- Parsing.

TEST_F(FileLabelPolicyParsePolicy, KeepsOneRecordALine) {
  EXPECT_EQ(
      ParseText("# labels\n\n/opt/tool/bin/run toolLabel # one\n  /opt/tool/*  baseLabel").Text(),
      Lines({Validated("toolLabel"), Validated("baseLabel"), "returns"}));
  EXPECT_EQ(Records(), Lines({
                           R"("/opt/tool/bin/run" toolLabel entry )" + tree / "labels:3",
                           R"("/opt/tool" baseLabel tree )" + tree / "labels:4",
                       }));
}

TEST_F(FileLabelPolicyParsePolicy, TakesPathsAsWritten) {
  EXPECT_EQ(ParseText("tool/ toolLabel\n../x/./y toolLabel\n//a//* toolLabel\n* toolLabel\n"
                      "/a* toolLabel\n")
                .exceptionType,
            "");
  EXPECT_EQ(Records(), Lines({
                           R"("tool/" toolLabel entry )" + tree / "labels:1",
                           R"("../x/./y" toolLabel entry )" + tree / "labels:2",
                           R"("//a/" toolLabel tree )" + tree / "labels:3",
                           R"("*" toolLabel entry )" + tree / "labels:4",
                           R"("/a*" toolLabel entry )" + tree / "labels:5",
                       }));
}

TEST_F(FileLabelPolicyParsePolicy, MakesAnEmptyPathOfTheBareStar) {
  ParseText("/* toolLabel\n");
  EXPECT_EQ(Records(), Lines({R"("" toolLabel tree )" + tree / "labels:1"}));
}

TEST_F(FileLabelPolicyParsePolicy, AddsNothingForAFileWithoutWords) {
  EXPECT_EQ(ParseText("\n# nothing\n   \n").Text(), Lines({"returns"}));
  EXPECT_EQ(Records(), "");
}

TEST_F(FileLabelPolicyParsePolicy, AppendsFileAfterFile) {
  tree.Write("one", "/a toolLabel\n");
  tree.Write("two", "/b toolLabel\n");
  Parse(tree / "two");
  Parse(tree / "one");
  EXPECT_EQ(Records(), Lines({
                           R"("/b" toolLabel entry )" + tree / "two:1",
                           R"("/a" toolLabel entry )" + tree / "one:1",
                       }));
}

TEST_F(FileLabelPolicyParsePolicy, RefusesThreeWords) {
  EXPECT_EQ(ParseText("/a toolLabel\n/b toolLabel more\n/c toolLabel\n").Text(),
            Lines({Validated("toolLabel"), Refused(2, "incorrect no of parameters")}));
  EXPECT_EQ(Records(), Lines({R"("/a" toolLabel entry )" + tree / "labels:1"}));
}

TEST_F(FileLabelPolicyParsePolicy, RefusesOneWord) {
  EXPECT_EQ(ParseText("\n\n\n\n\n\n/a\n").Text(),
            Lines({Refused(7, "incorrect no of parameters")}));
}

TEST_F(FileLabelPolicyParsePolicy, RefusesAStarThatIsNotAtTheEnd) {
  for (const char* specification : {"/opt/tool/*.so", "/a/*/b/*", "/a/**", "/*/*", "/*/"}) {
    EXPECT_EQ(ParseText(std::string(specification) + " toolLabel\n").Text(),
              Lines({Validated("toolLabel"),
                     Refused(1, "Unrecognized format for file/dir specification")}))
        << specification;
  }
  EXPECT_EQ(Records(), "");
  EXPECT_EQ(ParseText("/a/b/* toolLabel\n").Text(), Lines({Validated("toolLabel"), "returns"}));
  EXPECT_EQ(Records(), Lines({R"("/a/b" toolLabel tree )" + tree / "labels:1"}));
}

TEST_F(FileLabelPolicyParsePolicy, PassesTheKernelsMessageForAnUnknownLabel) {
  host.FailWith("ValidateKeyword", With(R"(LABEL, "noLabel")"), DerivedBraxoException("no word"));
  EXPECT_EQ(ParseText("/a toolLabel\n/b noLabel\n").Text(),
            Lines({
                Validated("toolLabel"),
                Validated("noLabel"),
                "throws Braxo::Lib::BraxoException: no word",
            }));
  EXPECT_EQ(Records(), Lines({R"("/a" toolLabel entry )" + tree / "labels:1"}));
}

TEST_F(FileLabelPolicyParsePolicy, ChecksTheLabelBeforeThePath) {
  host.Fail("ValidateKeyword", With(R"(LABEL, "noLabel")"), "no word");
  EXPECT_EQ(ParseText("/a/*/b noLabel\n").Text(),
            Lines({Validated("noLabel"), "throws Braxo::Lib::BraxoException: no word"}));
}

TEST_F(FileLabelPolicyParsePolicy, ChecksTheNumberOfWordsBeforeTheLabel) {
  host.Fail("ValidateKeyword", "no word");
  EXPECT_EQ(ParseText("/a/*/b noLabel more\n").Text(),
            Lines({Refused(1, "incorrect no of parameters")}));
}

TEST_F(FileLabelPolicyParsePolicy, DoesNotUseTheResultOfTheCheck) {
  host.ReturnFalse("ValidateKeyword");
  EXPECT_EQ(ParseText("/a toolLabel\n").Text(), Lines({Validated("toolLabel"), "returns"}));
  EXPECT_EQ(Records(), Lines({R"("/a" toolLabel entry )" + tree / "labels:1"}));
}

TEST_F(FileLabelPolicyParsePolicy, RefusesAFileThatCannotBeOpened) {
  EXPECT_EQ(
      Parse(tree / "none").Text(),
      Lines({"throws Braxo::Lib::BraxoException: Unable to open policy file " + tree / "none"}));
}

TEST_F(FileLabelPolicyParsePolicy, PassesForeignExceptions) {
  host.FailForeign("ValidateKeyword");
  EXPECT_EQ(ParseText("/a toolLabel\n").Text(),
            Lines({Validated("toolLabel"), "throws SecPolicyTest::ForeignException: foreign"}));
}

// ---- Applying.

TEST_F(FileLabelPolicySetFileLabels, AppliesAndDropsTheRecordsInOrder) {
  tree.Write("dir/file", "");
  policy.fileLabels = {{"/b", "toolLabel", false, "/p", 1},
                       {tree / "dir", "baseLabel", true, "/p", 2},
                       {"/a", "toolLabel", false, "/p", 3}};
  EXPECT_EQ(Apply().Text(), Lines({
                                Labelled("/b", "toolLabel"),
                                Labelled(tree / "dir", "baseLabel"),
                                Labelled(tree / "dir/file", "baseLabel"),
                                Labelled("/a", "toolLabel"),
                                "returns",
                            }));
  EXPECT_TRUE(policy.fileLabels.empty());
}

TEST_F(FileLabelPolicySetFileLabels, DoesNothingWithoutRecords) {
  EXPECT_EQ(Apply().Text(), Lines({"returns"}));
}

TEST_F(FileLabelPolicySetFileLabels, LeavesTheLaterOfTwoLabels) {
  policy.fileLabels = {{"/f", "toolLabel", false, "/p", 1}, {"/f", "baseLabel", false, "/p", 2}};
  EXPECT_EQ(Apply().exceptionType, "");
  EXPECT_EQ(SecPolicy::GetFileLabel("/f", access), "baseLabel");
}

TEST_F(FileLabelPolicySetFileLabels, ReportsARecordThatFailsAndGoesOn) {
  host.FailErrno("SetXattr", "/b", ENODATA);
  policy.fileLabels = {{"/a", "toolLabel", false, "/p/one", 1},
                       {"/b", "toolLabel", false, "/p/one", 7},
                       {"/c", "toolLabel", false, "/p/two", 1}};
  EXPECT_EQ(
      Apply().Text(),
      Lines({
          Labelled("/a", "toolLabel"),
          Labelled("/b", "toolLabel"),
          ReportedError(
              "/p/one:7 : Unable to set file label (toolLabel) for file /b: No data available"),
          Labelled("/c", "toolLabel"),
          "throws Braxo::Lib::BraxoException: There was a failure in setting file labels",
      }));
  EXPECT_TRUE(policy.fileLabels.empty());
}

TEST_F(FileLabelPolicySetFileLabels, RefusesALabelThatNoLongerExists) {
  host.DeclareLabel("goneLabel", 1);
  policy.fileLabels = {{"/a", "goneLabel", false, "/p", 3}};
  EXPECT_EQ(Apply().Text(),
            Lines({
                R"(LookupLabel("goneLabel", OBJECT))",
                ReportedError("/p:3 : Invalid label (goneLabel) for file /a"),
                "throws Braxo::Lib::BraxoException: There was a failure in setting file labels",
            }));
}

TEST_F(FileLabelPolicySetFileLabels, FailsForATreeThatIsAFile) {
  tree.Write("file", "");
  policy.fileLabels = {{tree / "file", "toolLabel", true, "/p", 4}};
  EXPECT_EQ(Apply().Text(),
            Lines({
                Labelled(tree / "file", "toolLabel"),
                ReportedError("/p:4 : Unable to open directory " + tree / "file"),
                "throws Braxo::Lib::BraxoException: There was a failure in setting file labels",
            }));
}

TEST_F(FileLabelPolicySetFileLabels, FailsForTheEmptyPathOfTheBareStar) {
  policy.fileLabels = {{"", "toolLabel", true, "/p", 5}};
  EXPECT_EQ(Apply().Text(),
            Lines({
                Labelled("", "toolLabel"),
                ReportedError("/p:5 : Unable to set file label (toolLabel) for file : No such "
                              "file or directory"),
                "throws Braxo::Lib::BraxoException: There was a failure in setting file labels",
            }));
}

TEST_F(FileLabelPolicySetFileLabels, PassesForeignExceptionsWithoutAReport) {
  policy.fileLabels = {{"/a", "toolLabel", false, "/p", 1}, {"/b", "toolLabel", false, "/p", 2}};
  host.FailForeign("LookupLabel");
  EXPECT_EQ(Apply().Text(), Lines({
                                R"(LookupLabel("toolLabel", OBJECT))",
                                "throws SecPolicyTest::ForeignException: foreign",
                            }));
}

TEST_F(FileLabelPolicySetFileLabels, IsLeftByAFailingReport) {
  policy.fileLabels = {{"/a", "toolLabel", false, "/p", 1}, {"/b", "toolLabel", false, "/p", 2}};
  host.syslogRunning = false;
  host.Fail("LookupLabel", "no table");
  host.Fail("WriteToKlog", "no log");
  EXPECT_EQ(Apply().Text(), Lines({
                                R"(LookupLabel("toolLabel", OBJECT))",
                                R"(stderr "Error: /p:1 : no table\n")",
                                R"(WriteToKlog("/p:1 : no table", "[ERR]"))",
                                "throws Braxo::Lib::BraxoException: no log",
                            }));
}

// ---- Loading.

TEST_F(LoadPolicyFileLabels, ReportsItsTwoStepsForAnEmptyDirectory) {
  tree.Write("fileLabels/", "");
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({
                ReportedInformation("Parsed all file label mappings"),
                ReportedInformation("Set all file labels"),
                "returns",
            }));
}

TEST_F(LoadPolicyFileLabels, ParsesAllFilesInOrderOfTheirNamesThenApplies) {
  tree.Write("fileLabels/b", "/fromB toolLabel\n");
  tree.Write("fileLabels/a", "/fromA toolLabel\n/alsoFromA baseLabel\n");
  tree.Write("fileLabels/sub/c", "/never toolLabel\n");
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({
                Validated("toolLabel"),
                Validated("baseLabel"),
                Validated("toolLabel"),
                ReportedInformation("Parsed all file label mappings"),
                Labelled("/fromA", "toolLabel"),
                Labelled("/alsoFromA", "baseLabel"),
                Labelled("/fromB", "toolLabel"),
                ReportedInformation("Set all file labels"),
                "returns",
            }));
}

TEST_F(LoadPolicyFileLabels, AppliesWhatStandsBeforeABadLine) {
  tree.Write("fileLabels/a", "/1 toolLabel\n/2 toolLabel\n/3 toolLabel more\n/4 toolLabel\n");
  tree.Write("fileLabels/b", "/5 toolLabel\n");
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({
                Validated("toolLabel"),
                Validated("toolLabel"),
                ReportedError("Error parsing file " + tree / "fileLabels/a"),
                ReportedError(tree / "fileLabels/a:3 : incorrect no of parameters"),
                Validated("toolLabel"),
                ReportedError("Error in parsing some file label mappings."),
                Labelled("/1", "toolLabel"),
                Labelled("/2", "toolLabel"),
                Labelled("/5", "toolLabel"),
                ReportedInformation("Set all file labels"),
                "throws Braxo::Lib::BraxoException: Failure in file labels policy",
            }));
}

TEST_F(LoadPolicyFileLabels, ReportsEveryBadFile) {
  tree.Write("fileLabels/short", "/a/*/b toolLabel\n");
  tree.Write("fileLabels/long-file-name", "/never toolLabel\n");
  tree.Write("fileLabels/word", "/c noLabel\n");
  host.FailWith("ValidateKeyword", With(R"(LABEL, "noLabel")"), DerivedBraxoException("no word"));
  const std::string dir = OverlongPath(tree / "fileLabels");
  EXPECT_EQ(Load(dir).Text(),
            Lines({
                ReportedError("Error parsing file " + dir + "/long-file-name"),
                ReportedError("Unable to open policy file " + dir + "/long-file-name"),
                Validated("toolLabel"),
                ReportedError("Error parsing file " + dir + "/short"),
                ReportedError(dir + "/short:1 : Unrecognized format for file/dir specification"),
                Validated("noLabel"),
                ReportedError("Error parsing file " + dir + "/word"),
                ReportedError("no word"),
                ReportedError("Error in parsing some file label mappings."),
                ReportedInformation("Set all file labels"),
                "throws Braxo::Lib::BraxoException: Failure in file labels policy",
            }));
}

TEST_F(LoadPolicyFileLabels, ReportsLabelsThatCannotBeSet) {
  tree.Write("fileLabels/a", "/a toolLabel\n/b toolLabel\n");
  host.FailErrno("SetXattr", "/a", ENODATA);
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({
                Validated("toolLabel"),
                Validated("toolLabel"),
                ReportedInformation("Parsed all file label mappings"),
                Labelled("/a", "toolLabel"),
                ReportedError(tree / "fileLabels/a" +
                              ":1 : Unable to set file label (toolLabel) for file /a: No data "
                              "available"),
                Labelled("/b", "toolLabel"),
                ReportedError("There was a failure in setting file labels"),
                ReportedError("Error in setting some file labels."),
                "throws Braxo::Lib::BraxoException: Failure in file labels policy",
            }));
}

TEST_F(LoadPolicyFileLabels, SaysBothWhenParsingAndSettingFail) {
  tree.Write("fileLabels/a", "/a toolLabel\n/b\n");
  host.FailErrno("SetXattr", "/a", ENODATA);
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({
                Validated("toolLabel"),
                ReportedError("Error parsing file " + tree / "fileLabels/a"),
                ReportedError(tree / "fileLabels/a:2 : incorrect no of parameters"),
                ReportedError("Error in parsing some file label mappings."),
                Labelled("/a", "toolLabel"),
                ReportedError(tree / "fileLabels/a" +
                              ":1 : Unable to set file label (toolLabel) for file /a: No data "
                              "available"),
                ReportedError("There was a failure in setting file labels"),
                ReportedError("Error in setting some file labels."),
                "throws Braxo::Lib::BraxoException: Failure in file labels policy",
            }));
}

TEST_F(LoadPolicyFileLabels, RefusesAtSetTimeALabelThatWasAcceptedWhileParsing) {
  tree.Write("fileLabels/a", "/a goneLabel\n");
  host.DeclareLabel("goneLabel", 1);
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({
                Validated("goneLabel"),
                ReportedInformation("Parsed all file label mappings"),
                R"(LookupLabel("goneLabel", OBJECT))",
                ReportedError(tree / "fileLabels/a:1 : Invalid label (goneLabel) for file /a"),
                ReportedError("There was a failure in setting file labels"),
                ReportedError("Error in setting some file labels."),
                "throws Braxo::Lib::BraxoException: Failure in file labels policy",
            }));
}

TEST_F(LoadPolicyFileLabels, ReportsNothingForADirectoryThatCannotBeOpened) {
  EXPECT_EQ(Load(tree / "none").Text(),
            Lines({"throws Braxo::Lib::BraxoException: Unable to open policy directory " +
                   tree / "none"}));
}

TEST_F(LoadPolicyFileLabels, PassesForeignExceptionsWhileParsing) {
  tree.Write("fileLabels/a", "/a toolLabel\n");
  tree.Write("fileLabels/b", "/b toolLabel\n");
  host.FailForeign("ValidateKeyword");
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({Validated("toolLabel"), "throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_F(LoadPolicyFileLabels, PassesForeignExceptionsWhileSetting) {
  tree.Write("fileLabels/a", "/a toolLabel\n/b toolLabel\n");
  host.FailForeign("LookupLabel");
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({
                Validated("toolLabel"),
                Validated("toolLabel"),
                ReportedInformation("Parsed all file label mappings"),
                R"(LookupLabel("toolLabel", OBJECT))",
                "throws SecPolicyTest::ForeignException: foreign",
            }));
}

// None of the reports of the parsing step is inside a guard.
TEST(LoadPolicyFileLabelsFaults, AFailingReportLeavesIt) {
  PolicyTree tree({{"fileLabels/a", "/a toolLabel\n/b\n"}});
  const std::string file = tree / "fileLabels/a";
  const std::vector<std::string> reports = {
      "Error parsing file " + file,
      file + ":2 : incorrect no of parameters",
      "Error in parsing some file label mappings.",
  };
  for (std::size_t failing = 0; failing < reports.size(); ++failing) {
    SCOPED_TRACE(reports[failing]);
    ScriptedHost host;
    host.syslogRunning = false;
    host.Fail("WriteToKlog", Nth(static_cast<unsigned int>(failing) + 1), "no log");
    TeskAccessInterfaceImpl access;
    std::string expected = Validated("toolLabel") + "\n";
    for (std::size_t report = 0; report <= failing; ++report) {
      expected += "stderr " + Quoted("Error: " + reports[report] + "\n") + "\nWriteToKlog(" +
                  Quoted(reports[report]) + ", \"[ERR]\")\n";
    }
    EXPECT_EQ(Record([&] { SecPolicy::LoadPolicyFileLabels(tree / "fileLabels", access); }).Text(),
              expected + "throws Braxo::Lib::BraxoException: no log\n");
  }
}

TEST_F(LoadPolicyFileLabels, IsLeftByAFailingReportOfItsProgress) {
  tree.Write("fileLabels/", "");
  host.syslogRunning = false;
  host.Fail("WriteToKlog", With(R"("Set all file labels", "[INFO]")"), "no log");
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({
                R"(WriteToKlog("Parsed all file label mappings", "[INFO]"))",
                R"(WriteToKlog("Set all file labels", "[INFO]"))",
                "throws Braxo::Lib::BraxoException: no log",
            }));
}

TEST_F(LoadPolicyFileLabels, TakesAFailingReportOfARecordForAFailureOfTheStep) {
  tree.Write("fileLabels/a", "/a toolLabel\n/b toolLabel\n");
  host.syslogRunning = false;
  host.Fail("LookupLabel", "no table");
  const std::string record = Quoted(tree / "fileLabels/a:1 : no table");
  host.Fail("WriteToKlog", With(record + R"(, "[ERR]")"), "no log");
  EXPECT_EQ(Load(tree / "fileLabels").Text(),
            Lines({
                Validated("toolLabel"),
                Validated("toolLabel"),
                R"(WriteToKlog("Parsed all file label mappings", "[INFO]"))",
                R"(LookupLabel("toolLabel", OBJECT))",
                "stderr " + Quoted("Error: " + tree / "fileLabels/a:1 : no table" + "\n"),
                "WriteToKlog(" + record + R"(, "[ERR]"))",
                R"(stderr "Error: no log\n")",
                R"(WriteToKlog("no log", "[ERR]"))",
                R"(stderr "Error: Error in setting some file labels.\n")",
                R"(WriteToKlog("Error in setting some file labels.", "[ERR]"))",
                "throws Braxo::Lib::BraxoException: Failure in file labels policy",
            }));
}

}  // namespace
}  // namespace SecPolicyTest
