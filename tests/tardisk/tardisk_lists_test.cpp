// Which tardisk a policy file belongs to: names without an end, files from none, two policies for
// one, and directories that cannot be listed.

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <filesystem>
#include <list>
#include <string>

#include "labels/expected_reports.h"
#include "labels/file_system_faults.h"
#include "secpolicy/secpolicy.h"
#include "support/fixed_roots.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using SecPolicy::TardiskPolicy;

using Paths = std::list<std::string>;

constexpr char kPolicyDir[] = "/etc/zorvan/secpolicy/tardisks";

// The host calls that read the inode record of `path`.
std::string BackingAsked(const std::string& path) {
  return "Sysinfo(1)\nSysinfo::AddInstancePath(" + Quoted(path) +
         ")\nSysinfo::Get(548)\n~Sysinfo()";
}

// ---- Which tardisk a policy file came from.

class BackingTardisk : public testing::Test {
 protected:
  BackingTardisk() { tree.Write("policy", ""); }

  Transcript Ask(const std::string& path) {
    return Record([&] { backing = TardiskPolicy(path).GetBackingTardiskPath(); });
  }

  ScriptedHost host;
  PolicyTree tree;
  std::string backing = "never asked";
};

TEST_F(BackingTardisk, IsThePathOfTheNameInTheInodeRecord) {
  host.SetTardisk(tree / "policy", "base.tgz");
  const unsigned int openBefore = OpenDescriptors();
  EXPECT_EQ(Ask(tree / "policy").Text(), Lines({BackingAsked(tree / "policy"), "returns"}));
  EXPECT_EQ(backing, "/tardisks/base.tgz");
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

TEST_F(BackingTardisk, IsEmptyForAFileFromNoTardisk) {
  host.SetTardisk(tree / "policy", "");
  EXPECT_EQ(Ask(tree / "policy").Text(), Lines({BackingAsked(tree / "policy"), "returns"}));
  EXPECT_EQ(backing, "");
}

TEST_F(BackingTardisk, TakesANameWithoutNulToTheEndOfTheRecord) {
  const std::string name(512, 'n');
  host.SetInodeRecord(tree / "policy", std::string(36, '\0') + name);
  EXPECT_EQ(Ask(tree / "policy").exceptionType, "");
  EXPECT_EQ(backing, "/tardisks/" + name);
}

TEST_F(BackingTardisk, IgnoresWhatFollowsTheName) {
  host.SetInodeRecord(tree / "policy", std::string(36, 'x') + std::string("a\0b", 3));
  EXPECT_EQ(Ask(tree / "policy").exceptionType, "");
  EXPECT_EQ(backing, "/tardisks/a");
}

TEST_F(BackingTardisk, IsEmptyWhereTheKernelFillsInNothing) {
  host.SetInodeRecord(tree / "policy", "");
  EXPECT_EQ(Ask(tree / "policy").exceptionType, "");
  EXPECT_EQ(backing, "");

  host.SetInodeRecord(tree / "policy", std::string(36, 'x') + "half");
  EXPECT_EQ(Ask(tree / "policy").exceptionType, "");
  EXPECT_EQ(backing, "/tardisks/half");
}

TEST_F(BackingTardisk, CannotBeFoundForAFileThatCannotBeOpened) {
  EXPECT_EQ(
      Ask(tree / "none").Text(),
      Lines({"throws Braxo::Lib::BraxoException: Unable to open policy file " + tree / "none"}));
  EXPECT_EQ(backing, "never asked");
}

TEST_F(BackingTardisk, CannotBeFoundWithoutTheFilesAttributes) {
  const unsigned int openBefore = OpenDescriptors();
  {
    const UnreadableAttributes unreadable;
    EXPECT_EQ(Ask(tree / "policy").Text(),
              Lines({"throws Braxo::Lib::BraxoException: Unable to get attributes for policy "
                     "file " +
                     tree / "policy"}));
  }
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

TEST_F(BackingTardisk, PassesWhateverTheRecordsReaderThrowsAndClosesTheFile) {
  host.SetTardisk(tree / "policy", "base.tgz");
  const unsigned int openBefore = OpenDescriptors();
  const std::string add = "Sysinfo::AddInstancePath(" + Quoted(tree / "policy") + ")";

  host.FailWith("Sysinfo::Get", Nth(1), DerivedBraxoException("no record"));
  EXPECT_EQ(Ask(tree / "policy").Text(),
            Lines({"Sysinfo(1)", add, "Sysinfo::Get(548)", "~Sysinfo()",
                   "throws SecPolicyTest::DerivedBraxoException: no record"}));
  host.FailForeign("Sysinfo::Get", Nth(2));
  EXPECT_EQ(Ask(tree / "policy").Text(),
            Lines({"Sysinfo(1)", add, "Sysinfo::Get(548)", "~Sysinfo()",
                   "throws SecPolicyTest::ForeignException: foreign"}));
  host.Fail("Sysinfo::AddInstancePath", "no such inode");
  EXPECT_EQ(
      Ask(tree / "policy").Text(),
      Lines({"Sysinfo(1)", add, "~Sysinfo()", "throws Braxo::Lib::BraxoException: no such inode"}));
  host.Fail("Sysinfo", "no such node");
  EXPECT_EQ(Ask(tree / "policy").Text(),
            Lines({"Sysinfo(1)", "throws Braxo::Lib::BraxoException: no such node"}));

  EXPECT_EQ(OpenDescriptors(), openBefore);
}

// ---- All tardisks.

class GetAllTardisks : public FixedRootsTest {
 protected:
  Transcript List() {
    return Record([&] { SecPolicy::GetAllTardisks(tardisks); });
  }

  ScriptedHost host;
  Paths tardisks;
};

Paths InListingOrder(const std::string& dir) {
  Paths paths;
  for (const std::string& name : ListingOrder(dir)) paths.push_back(dir + "/" + name);
  return paths;
}

TEST_F(GetAllTardisks, AreThePathsOfTheFilesInListingOrder) {
  const FixedRoots roots({{"/tardisks/m.tgz", ""},
                          {"/tardisks/a.tgz", ""},
                          {"/tardisks/z.tgz", ""},
                          {"/tardisks/.hidden", ""}});
  const unsigned int openBefore = OpenDescriptors();
  EXPECT_EQ(List().Text(), Lines({"returns"}));
  EXPECT_EQ(tardisks.size(), 4U);
  EXPECT_EQ(tardisks, InListingOrder("/tardisks"));
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

TEST_F(GetAllTardisks, AreAppended) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  tardisks = {"/tardisks/base.tgz", "other"};
  EXPECT_EQ(List().Text(), Lines({"returns"}));
  EXPECT_EQ(tardisks, (Paths{"/tardisks/base.tgz", "other", "/tardisks/base.tgz"}));
}

TEST_F(GetAllTardisks, AreNoneInAnEmptyDirectory) {
  const FixedRoots roots;
  EXPECT_EQ(List().Text(), Lines({"returns"}));
  EXPECT_EQ(tardisks, Paths{});
}

TEST_F(GetAllTardisks, LeaveOutWhateverIsNoFileAndCallItADirectory) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {"/elsewhere/file", ""}});
  std::filesystem::create_symlink("/elsewhere/file", "/tardisks/link.tgz");
  EXPECT_EQ(List().Text(), Lines({ReportedError("Skipping directory link.tgz"), "returns"}));
  std::filesystem::remove("/tardisks/link.tgz");

  ASSERT_EQ(mkfifo("/tardisks/fifo", 0600), 0);
  EXPECT_EQ(List().Text(), Lines({ReportedError("Skipping directory fifo"), "returns"}));
  std::filesystem::remove("/tardisks/fifo");

  std::filesystem::create_directory("/tardisks/dir");
  EXPECT_EQ(List().Text(), Lines({ReportedError("Skipping directory dir"), "returns"}));
  std::filesystem::remove("/tardisks/dir");

  EXPECT_EQ(tardisks, (Paths{"/tardisks/base.tgz", "/tardisks/base.tgz", "/tardisks/base.tgz"}));
}

TEST_F(GetAllTardisks, LeaveOutFilesThatTheListingDoesNotTellToBeOnes) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  const UntypedEntry untyped("base.tgz");
  EXPECT_EQ(List().Text(), Lines({ReportedError("Skipping directory base.tgz"), "returns"}));
  EXPECT_EQ(tardisks, Paths{});
}

TEST_F(GetAllTardisks, CannotBeListedWithoutTheirDirectory) {
  const FixedRoots roots;
  std::filesystem::remove("/tardisks");
  tardisks = {"kept"};
  EXPECT_EQ(List().Text(),
            Lines({"throws Braxo::Lib::BraxoException: Could not open tardisk dir /tardisks/"}));
  EXPECT_EQ(tardisks, Paths{"kept"});
}

TEST_F(GetAllTardisks, AreLeftByAFailingReportWithTheDirectoryClosed) {
  const FixedRoots roots({{"/tardisks/dir/", ""}});
  const unsigned int openBefore = OpenDescriptors();
  host.syslogRunning = false;
  host.FailForeign("WriteToKlog");
  EXPECT_EQ(List().Text(), Lines({
                               R"(stderr "Error: Skipping directory dir\n")",
                               R"(WriteToKlog("Skipping directory dir", "[ERR]"))",
                               "throws SecPolicyTest::ForeignException: foreign",
                           }));
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

// ---- Tardisks with and without a policy.

class GetTardiskLists : public FixedRootsTest {
 protected:
  ~GetTardiskLists() override { DeletePolicies(); }

  Transcript List(const std::string& dir = kPolicyDir) {
    return Record([&] { SecPolicy::GetTardiskLists(dir, policies, unmatched); });
  }
  // The paths of the tardisks that the policies belong to.
  Paths Backings() const {
    Paths backings;
    for (TardiskPolicy* policy : policies) backings.push_back(policy->GetBackingTardiskPath());
    return backings;
  }
  void DeletePolicies() {
    for (const TardiskPolicy* policy : policies) delete policy;
    policies.clear();
  }

  ScriptedHost host;
  std::list<TardiskPolicy*> policies;
  Paths unmatched;
};

std::string PolicyFile(const std::string& name) { return std::string(kPolicyDir) + "/" + name; }

TEST_F(GetTardiskLists, StayEmptyWithoutAPolicyDirectory) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  EXPECT_EQ(List().Text(), Lines({
                               ReportedInformation("Skipping tardisk policy as "
                                                   "/etc/zorvan/secpolicy/tardisks does not exist"),
                               "returns",
                           }));
  EXPECT_TRUE(policies.empty());
  EXPECT_EQ(unmatched, Paths{});
}

TEST_F(GetTardiskLists, StayAsTheyWereWithoutAPolicyDirectory) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}});
  policies = {new TardiskPolicy("/p")};
  unmatched = {"kept"};
  EXPECT_EQ(List().exceptionType, "");
  EXPECT_EQ(policies.size(), 1U);
  EXPECT_EQ(unmatched, Paths{"kept"});
}

TEST_F(GetTardiskLists, CannotBeMadeWhenThePolicyDirectoryIsNone) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {kPolicyDir, "a file"}});
  EXPECT_EQ(List().Text(), Lines({
                               "throws Braxo::Lib::BraxoException: Unable to open policy directory "
                               "for tardisks /etc/zorvan/secpolicy/tardisks",
                           }));
  EXPECT_EQ(unmatched, Paths{});
}

TEST_F(GetTardiskLists, CannotBeMadeWithoutTheTardisks) {
  const FixedRoots roots({{PolicyFile("base"), ""}});
  std::filesystem::remove("/tardisks");
  EXPECT_EQ(List().Text(),
            Lines({"throws Braxo::Lib::BraxoException: Could not open tardisk dir /tardisks/"}));
}

TEST_F(GetTardiskLists, AskForTheTardisksFirst) {
  const FixedRoots roots({{"/tardisks/dir/", ""}});
  EXPECT_EQ(List().Text(), Lines({
                               ReportedError("Skipping directory dir"),
                               ReportedInformation("Skipping tardisk policy as "
                                                   "/etc/zorvan/secpolicy/tardisks does not exist"),
                               "returns",
                           }));
}

TEST_F(GetTardiskLists, HaveEveryTardiskUnmatchedInAnEmptyPolicyDirectory) {
  const FixedRoots roots({{"/tardisks/m.tgz", ""},
                          {"/tardisks/a.tgz", ""},
                          {"/tardisks/z.tgz", ""},
                          {std::string(kPolicyDir) + "/", ""}});
  const unsigned int openBefore = OpenDescriptors();
  unmatched = {"kept"};
  EXPECT_EQ(List().Text(), Lines({"returns"}));
  Paths expected = InListingOrder("/tardisks");
  expected.push_front("kept");
  EXPECT_EQ(unmatched, expected);
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

TEST_F(GetTardiskLists, GiveAPolicyToItsTardiskAndLeaveTheOthersUnmatched) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""},
                          {"/tardisks/tool.tgz", ""},
                          {"/tardisks/extra.tgz", ""},
                          {PolicyFile("tool"), ""}});
  host.SetTardisk(PolicyFile("tool"), "tool.tgz");
  EXPECT_EQ(List().Text(), Lines({BackingAsked(PolicyFile("tool")), "returns"}));
  EXPECT_EQ(Backings(), Paths{"/tardisks/tool.tgz"});
  Paths expected = InListingOrder("/tardisks");
  expected.remove("/tardisks/tool.tgz");
  EXPECT_EQ(unmatched, expected);
  EXPECT_EQ(unmatched.size(), 2U);
}

TEST_F(GetTardiskLists, LoseEveryMentionOfATardiskThatAPolicyClaims) {
  const FixedRoots roots(
      {{"/tardisks/base.tgz", ""}, {"/tardisks/tool.tgz", ""}, {PolicyFile("tool"), ""}});
  host.SetTardisk(PolicyFile("tool"), "tool.tgz");
  {
    const RepeatedEntry repeated("tool.tgz");
    EXPECT_EQ(List().exceptionType, "");
  }
  EXPECT_EQ(unmatched, Paths{"/tardisks/base.tgz"});

  unmatched.clear();
  DeletePolicies();
  const RepeatedEntry repeated("base.tgz");
  EXPECT_EQ(List().exceptionType, "");
  EXPECT_EQ(unmatched, (Paths{"/tardisks/base.tgz", "/tardisks/base.tgz"}));
}

TEST_F(GetTardiskLists, KeepATardiskThatAnotherPolicyOnlyResembles) {
  const FixedRoots roots(
      {{"/tardisks/tool.tgz", ""}, {"/tardisks/tool", ""}, {PolicyFile("tool"), ""}});
  host.SetTardisk(PolicyFile("tool"), "tool");
  EXPECT_EQ(List().exceptionType, "");
  EXPECT_EQ(unmatched, Paths{"/tardisks/tool.tgz"});
}

TEST_F(GetTardiskLists, KeepAPolicyWhoseTardiskIsGone) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {PolicyFile("tool"), ""}});
  host.SetTardisk(PolicyFile("tool"), "tool.tgz");
  EXPECT_EQ(List().exceptionType, "");
  EXPECT_EQ(Backings(), Paths{"/tardisks/tool.tgz"});
  EXPECT_EQ(unmatched, Paths{"/tardisks/base.tgz"});
}

TEST_F(GetTardiskLists, IgnoreAPolicyFileFromNoTardisk) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {PolicyFile("later"), ""}});
  host.SetTardisk(PolicyFile("later"), "");
  EXPECT_EQ(List().Text(), Lines({
                               BackingAsked(PolicyFile("later")),
                               ReportedError("No backing tardisk for policy file "
                                             "/etc/zorvan/secpolicy/tardisks/later"),
                               "returns",
                           }));
  EXPECT_TRUE(policies.empty());
  EXPECT_EQ(unmatched, Paths{"/tardisks/base.tgz"});
}

TEST_F(GetTardiskLists, KeepTheFirstListedOfTwoPoliciesOfATardisk) {
  const FixedRoots roots(
      {{"/tardisks/base.tgz", ""}, {PolicyFile("one"), ""}, {PolicyFile("two"), ""}});
  host.SetTardisk(PolicyFile("one"), "base.tgz");
  host.SetTardisk(PolicyFile("two"), "base.tgz");
  const std::vector<std::string> names = ListingOrder(kPolicyDir);
  const std::string first = PolicyFile(names[0]);
  const std::string second = PolicyFile(names[1]);
  EXPECT_EQ(
      List().Text(),
      Lines({
          BackingAsked(first),
          BackingAsked(second),
          BackingAsked(first),
          ReportedError("More than one exception specification for tardisk /tardisks/base.tgz"),
          ReportedError("Ignoring " + second),
          "returns",
      }));
  EXPECT_EQ(unmatched, Paths{});

  ASSERT_EQ(policies.size(), 1U);
  EXPECT_EQ(Record([&] { policies.front()->GetBackingTardiskPath(); }).Text(),
            Lines({BackingAsked(first), "returns"}));
}

TEST_F(GetTardiskLists, AskEarlierPoliciesInOrderUntilOneMatches) {
  const FixedRoots roots({{PolicyFile("one"), ""},
                          {PolicyFile("two"), ""},
                          {PolicyFile("three"), ""},
                          {PolicyFile("four"), ""}});
  const std::vector<std::string> names = ListingOrder(kPolicyDir);
  // The fourth listed belongs to the tardisk of the second.
  const char* const tardisks[] = {"a.tgz", "b.tgz", "c.tgz", "b.tgz"};
  for (std::size_t index = 0; index < 4; ++index) {
    host.SetTardisk(PolicyFile(names[index]), tardisks[index]);
  }
  const auto asked = [&](std::size_t index) { return BackingAsked(PolicyFile(names[index])); };
  EXPECT_EQ(List().Text(),
            Lines({
                asked(0),
                asked(1),
                asked(0),
                asked(2),
                asked(0),
                asked(1),
                asked(3),
                asked(0),
                asked(1),
                ReportedError("More than one exception specification for tardisk /tardisks/b.tgz"),
                ReportedError("Ignoring " + PolicyFile(names[3])),
                "returns",
            }));
  EXPECT_EQ(Backings(), (Paths{"/tardisks/a.tgz", "/tardisks/b.tgz", "/tardisks/c.tgz"}));
}

TEST_F(GetTardiskLists, CompareWithPoliciesThatWereThereBefore) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {"/p", ""}, {PolicyFile("two"), ""}});
  host.SetTardisk("/p", "base.tgz");
  host.SetTardisk(PolicyFile("two"), "base.tgz");
  policies = {new TardiskPolicy("/p")};
  EXPECT_EQ(
      List().Text(),
      Lines({
          BackingAsked(PolicyFile("two")),
          BackingAsked("/p"),
          ReportedError("More than one exception specification for tardisk /tardisks/base.tgz"),
          ReportedError("Ignoring /etc/zorvan/secpolicy/tardisks/two"),
          "returns",
      }));
  EXPECT_EQ(policies.size(), 1U);
  EXPECT_EQ(unmatched, Paths{"/tardisks/base.tgz"});
}

TEST_F(GetTardiskLists, SkipWhateverIsNoFileAndCallItADirectory) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {PolicyFile("sub/"), ""}});
  EXPECT_EQ(List().Text(), Lines({ReportedError("Skipping directory sub"), "returns"}));
  std::filesystem::remove(PolicyFile("sub"));

  std::filesystem::create_symlink("/tardisks/base.tgz", PolicyFile("link"));
  EXPECT_EQ(List().Text(), Lines({ReportedError("Skipping directory link"), "returns"}));
  std::filesystem::remove(PolicyFile("link"));

  roots.Write(PolicyFile("untyped"), "");
  const UntypedEntry untyped("untyped");
  EXPECT_EQ(List().Text(), Lines({ReportedError("Skipping directory untyped"), "returns"}));
  EXPECT_TRUE(policies.empty());
}

TEST_F(GetTardiskLists, EndAtAPolicyFileThatCannotBeOpened) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {PolicyFile("long-file-name"), ""}});
  const unsigned int openBefore = OpenDescriptors();
  const std::string dir = OverlongPath(kPolicyDir);
  EXPECT_EQ(List(dir).Text(), Lines({"throws Braxo::Lib::BraxoException: Unable to open policy "
                                     "file " +
                                     dir + "/long-file-name"}));
  EXPECT_TRUE(policies.empty());
  EXPECT_EQ(unmatched, Paths{});
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

TEST_F(GetTardiskLists, EndAtAPolicyFileWithoutAttributes) {
  const FixedRoots roots({{PolicyFile("base"), ""}});
  const UnreadableAttributes unreadable;
  EXPECT_EQ(List().Text(), Lines({"throws Braxo::Lib::BraxoException: Unable to get attributes "
                                  "for policy file /etc/zorvan/secpolicy/tardisks/base"}));
}

TEST_F(GetTardiskLists, LeaveEarlierPoliciesToTheCallerWhenALaterFails) {
  const FixedRoots roots(
      {{"/tardisks/base.tgz", ""}, {PolicyFile("one"), ""}, {PolicyFile("two"), ""}});
  host.SetTardisk(PolicyFile("one"), "a.tgz");
  host.SetTardisk(PolicyFile("two"), "b.tgz");
  const std::vector<std::string> names = ListingOrder(kPolicyDir);
  const unsigned int openBefore = OpenDescriptors();
  host.FailWith("Sysinfo::Get", Nth(2), DerivedBraxoException("no record"));
  EXPECT_EQ(List().Text(), Lines({
                               BackingAsked(PolicyFile(names[0])),
                               BackingAsked(PolicyFile(names[1])),
                               "throws SecPolicyTest::DerivedBraxoException: no record",
                           }));
  EXPECT_EQ(policies.size(), 1U);
  EXPECT_EQ(unmatched, Paths{});
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

TEST_F(GetTardiskLists, PassAForeignExceptionOfAnEarlierPolicyAskedAgain) {
  const FixedRoots roots({{PolicyFile("one"), ""}, {PolicyFile("two"), ""}});
  host.SetTardisk(PolicyFile("one"), "a.tgz");
  host.SetTardisk(PolicyFile("two"), "b.tgz");
  const std::vector<std::string> names = ListingOrder(kPolicyDir);
  host.FailForeign("Sysinfo::Get", Nth(3));
  EXPECT_EQ(List().Text(), Lines({
                               BackingAsked(PolicyFile(names[0])),
                               BackingAsked(PolicyFile(names[1])),
                               BackingAsked(PolicyFile(names[0])),
                               "throws SecPolicyTest::ForeignException: foreign",
                           }));
  EXPECT_EQ(policies.size(), 1U);
}

TEST_F(GetTardiskLists, AreLeftByAFailingReport) {
  const FixedRoots roots({{"/tardisks/base.tgz", ""}, {PolicyFile("later"), ""}});
  host.SetTardisk(PolicyFile("later"), "");
  host.syslogRunning = false;
  host.Fail("WriteToKlog", "no log");
  const unsigned int openBefore = OpenDescriptors();
  EXPECT_EQ(List().Text(), Lines({
                               BackingAsked(PolicyFile("later")),
                               R"(stderr "Error: No backing tardisk for policy file )"
                               R"(/etc/zorvan/secpolicy/tardisks/later\n")",
                               R"(WriteToKlog("No backing tardisk for policy file )"
                               R"(/etc/zorvan/secpolicy/tardisks/later", "[ERR]"))",
                               "throws Braxo::Lib::BraxoException: no log",
                           }));
  EXPECT_TRUE(policies.empty());
  EXPECT_EQ(unmatched, Paths{});
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

}  // namespace
}  // namespace SecPolicyTest
