// Hunts files that get a label of the wrong line, get it twice or get none, and lines that are
// dropped without a word.

#include "label/label_plan.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <map>

#include "host/linux/operation/state_use.h"
#include "support/policy_tree.h"

namespace {

using SecPolicyCli::ErrorList;
using SecPolicyCli::LabelLine;
using SecPolicyCli::LabelPlan;
using SecPolicyCli::LabelRun;
using SecPolicyTest::PolicyTree;
using SecPolicyTest::TemporaryDirectory;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::UnorderedElementsAre;

// A state of its own that knows three objects and a domain, and a tree of files.
class LabelPlanTest : public testing::Test {
 protected:
  LabelPlanTest() {
    run.access.AddLabels({"red", "green", "blue"}, TeskCtl::Security::TESKACCESS_LABEL_OBJECT);
    run.access.CreateDomain("oneDom", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
  }

  // Writes a policy file; "@" stands for the directory of the tree.
  void Write(const std::string& name, std::string text) {
    for (std::size_t at = text.find('@'); at != std::string::npos; at = text.find('@')) {
      text.replace(at, 1, files.Root());
    }
    policy.Write(name, text);
  }

  // "LABEL PLACE" of each file that the plan visits, by its path in the tree.
  std::multimap<std::string, std::string> Plan(const std::vector<std::string>& paths = {}) {
    testing::internal::CaptureStderr();
    std::multimap<std::string, std::string> plan;
    LabelPlan(run, policy.Root())
        .ForEachFile(paths, "testing",
                     [&](const LinuxHost::WalkedFile& file, const LabelLine& line) {
                       EXPECT_EQ(line.id, run.FindLabel(line.label.label));
                       plan.emplace(file.path.substr(files.Root().size()),
                                    line.label.label + " " + Short(line.Place()));
                     });
    testing::internal::GetCapturedStderr();
    return plan;
  }

  // The errors, with paths in the tree and names of policy files.
  std::vector<std::string> Errors() const {
    std::vector<std::string> messages;
    for (const std::string& message : errors.Messages()) messages.push_back(Short(message));
    return messages;
  }

  std::string Short(std::string text) const {
    for (const std::string& root : {policy.Root() + "/", files.Root()}) {
      for (std::size_t at = text.find(root); at != std::string::npos; at = text.find(root)) {
        text.erase(at, root.size());
      }
    }
    return text;
  }

  TemporaryDirectory directory;
  LinuxHost::UsedState state{directory / "host.db"};
  ErrorList errors;
  LabelRun run{errors, false};
  PolicyTree policy;
  PolicyTree files{{"a/one", ""}, {"a/b/two", ""}, {"c", ""}};
};

TEST_F(LabelPlanTest, TakesTheLastLineOfEachFile) {
  Write("first", "@/a/b/two blue\n@/a/* red\n@/c red\n");
  Write("second", "\n@/c green\n@/a/one green\n");
  EXPECT_THAT(Plan(), ElementsAre(Pair("/a", "red first:2"), Pair("/a/b", "red first:2"),
                                  Pair("/a/b/two", "red first:2"), Pair("/a/one", "green second:3"),
                                  Pair("/c", "green second:2")));
  EXPECT_THAT(Errors(), IsEmpty());
}

TEST_F(LabelPlanTest, TakesAFileOfManyNamesOnce) {
  std::filesystem::create_hard_link(files / "c", files / "other");
  std::filesystem::create_directory_symlink("a", files / "link");
  Write("labels", "@/c red\n@/other green\n@/a/one red\n@/link/one blue\n");
  EXPECT_THAT(Plan(),
              ElementsAre(Pair("/link/one", "blue labels:4"), Pair("/other", "green labels:2")));
}

TEST_F(LabelPlanTest, LeavesLinksInTreesAlone) {
  std::filesystem::create_symlink("../c", files / "a/link");
  Write("labels", "@/a/b/* red\n@/a/* green\n");
  EXPECT_THAT(Plan(),
              ElementsAre(Pair("/a", "green labels:2"), Pair("/a/b", "green labels:2"),
                          Pair("/a/b/two", "green labels:2"), Pair("/a/one", "green labels:2")));
}

TEST_F(LabelPlanTest, KeepsToTheChosenPaths) {
  Write("labels", "@/a/* red\n@/a/one green\n@/c blue\n");
  EXPECT_THAT(Plan({files / "a/b"}),
              UnorderedElementsAre(Pair("/a/b", "red labels:1"), Pair("/a/b/two", "red labels:1")));
  EXPECT_THAT(Plan({files / "c", files / "a/one"}),
              UnorderedElementsAre(Pair("/c", "blue labels:3"), Pair("/a/one", "green labels:2")));
  EXPECT_THAT(Errors(), IsEmpty());
}

TEST_F(LabelPlanTest, ReportsLinesThatALoadDoesNotTake) {
  Write("bad", "@/c red\n@/a/one\n@/a/* green\n");
  Write("domain", "@/c oneDom\n@/a/one blue\n");
  EXPECT_THAT(Plan(), ElementsAre(Pair("/a/one", "blue domain:2"), Pair("/c", "red bad:1")));
  EXPECT_THAT(Errors(), ElementsAre("Error parsing file bad", "bad:2 : incorrect no of parameters",
                                    "domain:1 : Invalid label (oneDom) for file /c"));
}

TEST_F(LabelPlanTest, ReportsPathsThatLeadNowhere) {
  Write("labels", "@/none red\n@/c/* green\n");
  EXPECT_THAT(Plan(), ElementsAre(Pair("/c", "green labels:2")));
  EXPECT_THAT(Errors(), ElementsAre("labels:2 : /c: Not a directory",
                                    "labels:1 : /none: No such file or directory"));
}

TEST_F(LabelPlanTest, NeedsADirectory) {
  EXPECT_THROW(LabelPlan(run, "/no/such"), Braxo::Lib::BraxoException);
}

}  // namespace
