// Files of object names: which are read, what one bad line takes away from the kernel, and how
// objects are displayed.

#include "secpolicy/labels/object_policy.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "labels/expected_reports.h"
#include "labels/file_system_faults.h"
#include "secpolicy/secpolicy.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using SecPolicy::ObjectPolicy;
using TeskCtl::Security::TESKACCESS_KEYWORD_LABEL;

using Names = std::vector<std::string>;

class ObjectPolicyTest : public testing::Test {
 protected:
  Transcript Parse(const std::string& path) {
    return Record([&] { policy.ParsePolicy(path); });
  }
  Transcript Load(const std::string& dir) {
    return Record([&] { SecPolicy::LoadPolicyObjects(dir, access); });
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  PolicyTree tree;
  ObjectPolicy policy;
};

using ObjectPolicyParsePolicy = ObjectPolicyTest;
using ObjectPolicySetObjects = ObjectPolicyTest;
using LoadPolicyObjects = ObjectPolicyTest;
using DisplayPolicyObjects = ObjectPolicyTest;

TEST(ObjectPolicyShape, IsTheListOfNamesAndNothingElse) {
  EXPECT_EQ(sizeof(ObjectPolicy), sizeof(Names));
  EXPECT_FALSE(std::is_polymorphic_v<ObjectPolicy>);
}

TEST_F(ObjectPolicyParsePolicy, TakesOneNameALine) {
  tree.Write("obj", "# the objects\n\n  tool  # a tool\nbase\ntool\nlast");
  EXPECT_EQ(Parse(tree / "obj").Text(), Lines({"returns"}));
  EXPECT_EQ(policy.names, (Names{"tool", "base", "tool", "last"}));
}

TEST_F(ObjectPolicyParsePolicy, AddsToTheNamesHeld) {
  tree.Write("one", "a\n");
  tree.Write("two", "b\n");
  Parse(tree / "two");
  Parse(tree / "one");
  EXPECT_EQ(policy.names, (Names{"b", "a"}));
}

TEST_F(ObjectPolicyParsePolicy, TakesNothingFromAFileWithoutWords) {
  tree.Write("obj", "\n   \n# nothing\n");
  EXPECT_EQ(Parse(tree / "obj").Text(), Lines({"returns"}));
  EXPECT_EQ(policy.names, Names{});
}

TEST_F(ObjectPolicyParsePolicy, StopsAtALineWithTwoNames) {
  tree.Write("obj", "a\nb c\nd\n");
  EXPECT_EQ(Parse(tree / "obj").Text(),
            Lines({"throws Braxo::Lib::BraxoException: " + tree / "obj" +
                   ":2 : cannot define more than one object per line"}));
  EXPECT_EQ(policy.names, Names{"a"});
}

TEST_F(ObjectPolicyParsePolicy, CountsPhysicalLines) {
  tree.Write("obj", "a\n\n# b\n  \n\n\nb c\n");
  EXPECT_EQ(Parse(tree / "obj").Text(),
            Lines({"throws Braxo::Lib::BraxoException: " + tree / "obj" +
                   ":7 : cannot define more than one object per line"}));
}

TEST_F(ObjectPolicyParsePolicy, QuotesThePathAsGiven) {
  tree.Write("obj", "b c\n");
  EXPECT_EQ(Parse(tree / "./obj").Text(),
            Lines({"throws Braxo::Lib::BraxoException: " + tree / "./obj" +
                   ":1 : cannot define more than one object per line"}));
}

TEST_F(ObjectPolicyParsePolicy, RefusesAFileThatCannotBeOpened) {
  EXPECT_EQ(
      Parse(tree / "none").Text(),
      Lines({"throws Braxo::Lib::BraxoException: Unable to open policy file " + tree / "none"}));
  EXPECT_EQ(policy.names, Names{});
}

TEST_F(ObjectPolicySetObjects, SynchronisesTheKernelsObjectLabels) {
  host.keywords[TESKACCESS_KEYWORD_LABEL] = {{"old", 7}, {"base", 4}};
  policy.names = {"tool", "base"};
  EXPECT_EQ(Record([&] { policy.SetObjects(access); }).Text(),
            Lines({
                R"(GetKeywordsMap(LABEL))",
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels([], OBJECT))",
                R"(IsPredefinedLabel("old", OBJECT))",
                R"(RemoveLabels(["old"], OBJECT))",
                ReportedInformation("The following objects have been removed:"),
                ReportedInformation("old"),
                R"(AddLabels(["tool", "base"], OBJECT))",
                R"(returns)",
            }));
}

TEST_F(ObjectPolicySetObjects, PassesWhateverTheKernelThrows) {
  host.FailWith("GetKeywordsMap", Every(), DerivedBraxoException("no table"));
  EXPECT_EQ(Record([&] { policy.SetObjects(access); }).Text(),
            Lines({
                R"(GetKeywordsMap(LABEL))",
                R"(throws SecPolicyTest::DerivedBraxoException: no table)",
            }));
}

// The host calls of a load that changes nothing but adding `names`.
std::string Synchronised(const std::string& names) {
  return "GetKeywordsMap(LABEL)\nGetInvalidLabels(OBJECT)\nRemoveLabels([], OBJECT)\n"
         "AddLabels([], OBJECT)\nRemoveLabels([], OBJECT)\nAddLabels(" +
         names + ", OBJECT)";
}

TEST_F(LoadPolicyObjects, ReadsTheFilesInOrderOfTheirNames) {
  tree.Write("objects/b", "fromB\n");
  tree.Write("objects/a", "fromA\nalsoFromA\n");
  tree.Write("objects/B", "fromCapitalB\n");
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                ReportedInformation("Parsed all objects"),
                Synchronised(R"(["fromCapitalB", "fromA", "alsoFromA", "fromB"])"),
                ReportedInformation("Objects defined and obsolete objects removed"),
                R"(returns)",
            }));
}

TEST_F(LoadPolicyObjects, SynchronisesToNothingForAnEmptyDirectory) {
  tree.Write("objects/", "");
  host.keywords[TESKACCESS_KEYWORD_LABEL] = {{"old", 7}, {"unlabeled", 2}};
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                ReportedInformation("Parsed all objects"),
                R"(GetKeywordsMap(LABEL))",
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels([], OBJECT))",
                R"(IsPredefinedLabel("old", OBJECT))",
                R"(IsPredefinedLabel("unlabeled", OBJECT))",
                R"(RemoveLabels(["old"], OBJECT))",
                ReportedInformation("The following objects have been removed:"),
                ReportedInformation("old"),
                R"(AddLabels([], OBJECT))",
                ReportedInformation("Objects defined and obsolete objects removed"),
                R"(returns)",
            }));
}

TEST_F(LoadPolicyObjects, HandsANameOfTwoFilesOnTwice) {
  tree.Write("objects/a", "tool\n");
  tree.Write("objects/b", "tool\n");
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                ReportedInformation("Parsed all objects"),
                Synchronised(R"(["tool", "tool"])"),
                ReportedInformation("Objects defined and obsolete objects removed"),
                R"(returns)",
            }));
}

TEST_F(LoadPolicyObjects, InstallsWhatWasReadBeforeABadLine) {
  tree.Write("objects/a", "a\nb c\nd\n");
  tree.Write("objects/b", "e\n");
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                ReportedError(tree / "objects/a:2 : cannot define more than one object per line"),
                ReportedError("Error in parsing some object files"),
                Synchronised(R"(["a", "e"])"),
                ReportedInformation("Objects defined and obsolete objects removed"),
                R"(throws Braxo::Lib::BraxoException: Failure in object policy)",
            }));
}

TEST_F(LoadPolicyObjects, RemovesNamesThatOnlyTheBrokenPartDefines) {
  tree.Write("objects/a", "b c\nd\n");
  host.keywords[TESKACCESS_KEYWORD_LABEL] = {{"d", 7}};
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                ReportedError(tree / "objects/a:1 : cannot define more than one object per line"),
                ReportedError("Error in parsing some object files"),
                R"(GetKeywordsMap(LABEL))",
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels([], OBJECT))",
                R"(IsPredefinedLabel("d", OBJECT))",
                R"(RemoveLabels(["d"], OBJECT))",
                ReportedInformation("The following objects have been removed:"),
                ReportedInformation("d"),
                R"(AddLabels([], OBJECT))",
                ReportedInformation("Objects defined and obsolete objects removed"),
                R"(throws Braxo::Lib::BraxoException: Failure in object policy)",
            }));
}

TEST_F(LoadPolicyObjects, ReportsAFileThatCannotBeOpenedLikeABadLine) {
  tree.Write("objects/short", "tool\n");
  tree.Write("objects/long-file-name", "never read\n");
  const std::string dir = OverlongPath(tree / "objects");
  EXPECT_EQ(Load(dir).Text(),
            Lines({
                ReportedError("Unable to open policy file " + dir + "/long-file-name"),
                ReportedError("Error in parsing some object files"),
                Synchronised(R"(["tool"])"),
                ReportedInformation("Objects defined and obsolete objects removed"),
                R"(throws Braxo::Lib::BraxoException: Failure in object policy)",
            }));
}

TEST_F(LoadPolicyObjects, DoesNotSynchroniseWithoutADirectory) {
  EXPECT_EQ(Load(tree / "none").Text(),
            Lines({"throws Braxo::Lib::BraxoException: Unable to open policy directory " +
                   tree / "none"}));
}

TEST_F(LoadPolicyObjects, KeepsTheReasonOfAFailedSynchronisationToItself) {
  tree.Write("objects/a", "tool\n");
  host.Fail("AddLabels", Nth(2), "table full");
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                ReportedInformation("Parsed all objects"),
                Synchronised(R"(["tool"])"),
                ReportedError("Error in defining some objects"),
                R"(throws Braxo::Lib::BraxoException: Failure in object policy)",
            }));
}

TEST_F(LoadPolicyObjects, SaysBothWhenParsingAndSynchronisingFail) {
  tree.Write("objects/a", "tool\nb c\n");
  host.Fail("GetKeywordsMap", "no table");
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                ReportedError(tree / "objects/a:2 : cannot define more than one object per line"),
                ReportedError("Error in parsing some object files"),
                R"(GetKeywordsMap(LABEL))",
                ReportedError("Error in defining some objects"),
                R"(throws Braxo::Lib::BraxoException: Failure in object policy)",
            }));
}

TEST_F(LoadPolicyObjects, TurnsADerivedExceptionIntoItsOwn) {
  tree.Write("objects/a", "tool\n");
  host.FailWith("GetKeywordsMap", Every(), DerivedBraxoException("no table"));
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                ReportedInformation("Parsed all objects"),
                R"(GetKeywordsMap(LABEL))",
                ReportedError("Error in defining some objects"),
                R"(throws Braxo::Lib::BraxoException: Failure in object policy)",
            }));
}

TEST_F(LoadPolicyObjects, PassesForeignExceptions) {
  tree.Write("objects/a", "tool\n");
  host.FailForeign("GetInvalidLabels");
  EXPECT_EQ(Load(tree / "objects").Text(), Lines({
                                               ReportedInformation("Parsed all objects"),
                                               R"(GetKeywordsMap(LABEL))",
                                               R"(GetInvalidLabels(OBJECT))",
                                               R"(throws SecPolicyTest::ForeignException: foreign)",
                                           }));
}

TEST_F(LoadPolicyObjects, IsLeftByAFailingReportOfABadFile) {
  tree.Write("objects/a", "b c\n");
  host.syslogRunning = false;
  host.Fail("WriteToKlog", Nth(1), "no log");
  const std::string message = tree / "objects/a:1 : cannot define more than one object per line";
  EXPECT_EQ(Load(tree / "objects").Text(), Lines({
                                               "stderr " + Quoted("Error: " + message + "\n"),
                                               "WriteToKlog(" + Quoted(message) + R"(, "[ERR]"))",
                                               R"(throws Braxo::Lib::BraxoException: no log)",
                                           }));
}

TEST_F(LoadPolicyObjects, IsLeftByAFailingReportOfItsProgress) {
  tree.Write("objects/a", "tool\n");
  host.syslogRunning = false;
  host.Fail("WriteToKlog", With(R"("Parsed all objects", "[INFO]")"), "no log");
  EXPECT_EQ(Load(tree / "objects").Text(), Lines({
                                               R"(WriteToKlog("Parsed all objects", "[INFO]"))",
                                               R"(throws Braxo::Lib::BraxoException: no log)",
                                           }));
}

TEST_F(LoadPolicyObjects, IsLeftByAFailingReportOfAFailedSynchronisation) {
  tree.Write("objects/a", "tool\n");
  host.syslogRunning = false;
  host.Fail("GetKeywordsMap", "no table");
  host.Fail("WriteToKlog", With(R"("Error in defining some objects", "[ERR]")"), "no log");
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                R"(WriteToKlog("Parsed all objects", "[INFO]"))",
                R"(GetKeywordsMap(LABEL))",
                R"(stderr "Error: Error in defining some objects\n")",
                R"(WriteToKlog("Error in defining some objects", "[ERR]"))",
                R"(throws Braxo::Lib::BraxoException: no log)",
            }));
}

// A report inside the synchronisation is part of it.
TEST_F(LoadPolicyObjects, CountsAFailingReportOfRemovedLabelsAsAFailedSynchronisation) {
  tree.Write("objects/a", "tool\n");
  host.keywords[TESKACCESS_KEYWORD_LABEL] = {{"old", 7}};
  host.syslogRunning = false;
  host.Fail("WriteToKlog", With(R"("old", "[INFO]")"), "no log");
  EXPECT_EQ(Load(tree / "objects").Text(),
            Lines({
                R"(WriteToKlog("Parsed all objects", "[INFO]"))",
                R"(GetKeywordsMap(LABEL))",
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels([], OBJECT))",
                R"(IsPredefinedLabel("old", OBJECT))",
                R"(RemoveLabels(["old"], OBJECT))",
                R"(WriteToKlog("The following objects have been removed:", "[INFO]"))",
                R"(WriteToKlog("old", "[INFO]"))",
                R"(stderr "Error: Error in defining some objects\n")",
                R"(WriteToKlog("Error in defining some objects", "[ERR]"))",
                R"(throws Braxo::Lib::BraxoException: Failure in object policy)",
            }));
}

TEST_F(DisplayPolicyObjects, PrintsTheHeaderAloneWithoutObjects) {
  EXPECT_EQ(Record([&] { SecPolicy::DisplayPolicyObjects(access); }).Text(),
            Lines({
                R"(stdout "\n")",
                R"(stdout "\n")",
                R"(stdout "---------------------------------\n")",
                R"(stdout "Objects Defined: Name (Kernel Id)\n")",
                R"(stdout "---------------------------------\n")",
                R"(GetKeywordsMap(LABEL))",
                R"(returns)",
            }));
}

TEST_F(DisplayPolicyObjects, PrintsNamesInOrderWithTheirIdentifiers) {
  host.keywords[TESKACCESS_KEYWORD_LABEL] = {
      {"tool", 12}, {"base", 4294967297}, {"Zero", 0}, {"below", -1}};
  EXPECT_EQ(Record([&] { SecPolicy::DisplayPolicyObjects(access); }).Text(),
            Lines({
                R"(stdout "\n")",
                R"(stdout "\n")",
                R"(stdout "---------------------------------\n")",
                R"(stdout "Objects Defined: Name (Kernel Id)\n")",
                R"(stdout "---------------------------------\n")",
                R"(GetKeywordsMap(LABEL))",
                R"(stdout "Zero (0)\n")",
                R"(stdout "base (4294967297)\n")",
                R"(stdout "below (-1)\n")",
                R"(stdout "tool (12)\n")",
                R"(returns)",
            }));
}

TEST_F(DisplayPolicyObjects, PassesExceptionsAfterTheHeader) {
  host.FailWith("GetKeywordsMap", Every(), DerivedBraxoException("no table"));
  EXPECT_EQ(Record([&] { SecPolicy::DisplayPolicyObjects(access); }).Text(),
            Lines({
                R"(stdout "\n")",
                R"(stdout "\n")",
                R"(stdout "---------------------------------\n")",
                R"(stdout "Objects Defined: Name (Kernel Id)\n")",
                R"(stdout "---------------------------------\n")",
                R"(GetKeywordsMap(LABEL))",
                R"(throws SecPolicyTest::DerivedBraxoException: no table)",
            }));
}

}  // namespace
}  // namespace SecPolicyTest
