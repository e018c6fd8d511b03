// Hunts what a load tells and the command drops or mixes up.

#include "load/load_listener.h"

#include <gmock/gmock.h>

namespace {

using SecPolicyCli::LoadListener;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

class Watcher : public SecPolicyCli::LoadWatcher {
 public:
  void OnError(const std::string& message) override { told.push_back(message); }
  void OnProblem(const SecPolicy::Problem& problem) override { told.push_back(problem.file); }

  std::vector<std::string> told;
};

TEST(LoadListener, KeepsErrorsInOrderAndHandsAllOn) {
  Watcher watcher;
  LoadListener listener;
  listener.watcher = &watcher;
  listener.OnProblem({.file = "/a"});
  listener.OnError("first");
  listener.OnError("second");
  EXPECT_EQ(listener.Count(), 2u);
  EXPECT_THAT(listener.Messages(), ElementsAre("first", "second"));
  EXPECT_THAT(watcher.told, ElementsAre("/a", "first", "second"));
}

TEST(LoadListener, CountsProblemsByFile) {
  LoadListener listener;
  EXPECT_THAT(listener.Problems(), IsEmpty());
  for (const char* file : {"/b", "/a", "/b"}) listener.OnProblem({.file = file});
  EXPECT_THAT(listener.Problems(), ElementsAre(Pair("/a", 1), Pair("/b", 2)));
  EXPECT_EQ(listener.CountProblems(), 3u);
}

TEST(LoadListener, CountsAFileWithoutItsLabelAsAProblemAndAnEchoAsNone) {
  LoadListener listener;
  listener.OnLabelFailure("Unable to label /a");
  listener.OnError("Failure in file labels");
  EXPECT_EQ(listener.CountProblems(), 1u);
  EXPECT_EQ(listener.Count(), 2u);
}

TEST(LoadListener, NamesThePhases) {
  LoadListener listener;
  using enum SecPolicy::LoadPhase;
  for (const auto phase : {kObjects, kDomains, kPartnerDomains, kTardisks, kFileLabels}) {
    listener.OnEnd(phase);
  }
  std::vector<std::string> names;
  for (const auto& [name, time] : listener.timing.Phases()) names.push_back(name);
  EXPECT_THAT(names,
              ElementsAre("objects", "domains", "partner domains", "tardisks", "file labels"));
}

TEST(LoadListener, KeepsWhereLabelsAndTransitionsAreWritten) {
  LoadListener listener;
  listener.OnFileLabel({.path = "/opt",
                        .label = "tool",
                        .recursive = true,
                        .policyFile = "/p/fileLabels/a",
                        .lineNumber = 3});
  listener.OnTardiskTransition({.line = 2,
                                .domainId = 1,
                                .domainName = "hostDom",
                                .label = "tool",
                                .targetDomain = "toolDom",
                                .targetDomainId = 7,
                                .transitionKind = "tardisk_exec",
                                .grant = true},
                               "/p/tardisks/a");
  ASSERT_EQ(listener.Labels().size(), 1u);
  const auto& [path, isTree, label, labelFile, labelLine] = listener.Labels().front();
  EXPECT_EQ(std::tie(path, label, labelFile), std::tuple("/opt", "tool", "/p/fileLabels/a"));
  EXPECT_TRUE(isTree);
  EXPECT_EQ(labelLine, 3u);
  ASSERT_EQ(listener.Rules().size(), 1u);
  const auto& [domain, rule] = listener.Rules().front();
  EXPECT_EQ(domain, "hostDom");
  EXPECT_EQ(rule.Text(), "-d tool toolDom tardisk_exec grant");
  EXPECT_EQ(rule.origin.file, "/p/tardisks/a");
  EXPECT_EQ(rule.origin.line, 2u);
}

TEST(LoadListener, RemembersTheMissingDomain) {
  LoadListener listener;
  EXPECT_EQ(listener.MissingDomain(), "");
  listener.OnMissingDomain("appDom");
  EXPECT_EQ(listener.MissingDomain(), "appDom");
}

}  // namespace
