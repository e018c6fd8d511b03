// Which plans are applied: hunts for one that somebody else could have made or changed, or that is
// not about the files that are there. Nothing is started then, and one line says why.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "host/enforce/kernel.h"
#include "host/enforce/plan_file.h"
#include "launch.h"

namespace EnforceTest {
namespace {

namespace fs = std::filesystem;
using testing::StrEq;

class PlanSource : public testing::TestWithParam<User> {
 protected:
  void SetUp() override {
    if (!CanBe(user)) GTEST_SKIP() << "only root can start somebody as root";
    if (Lacks()) GTEST_SKIP() << Lacks();
  }

  Outcome RunWith(const std::string& source, const std::vector<int>& descriptors = {}) const {
    return RunLauncher({user, {"--plan", source}, {ProbePath(), "variable=PATH"}, {}, descriptors});
  }

  const User user = GetParam();
  const Tree tree{CanBe(GetParam()) ? GetParam() : User::kNobody};
  const std::string path = WritePlan(tree, PlanOf(tree));
};

INSTANTIATE_TEST_SUITE_P(Users, PlanSource, testing::Values(User::kRoot, User::kNobody),
                         [](const auto& tested) { return NameOf(tested.param); });

void ExpectStarted(const Outcome& outcome) {
  EXPECT_EQ(outcome.status, 0);
  EXPECT_THAT(outcome.errors, StrEq(""));
  EXPECT_THAT(outcome.output, StrEq("variable=PATH ok\n"));
}

void ExpectRefused(const Outcome& outcome, const std::string& message) {
  EXPECT_TRUE(WIFEXITED(outcome.status));
  EXPECT_EQ(WEXITSTATUS(outcome.status), 126);
  EXPECT_THAT(outcome.errors, StrEq("secpolicy-run: " + message + "\n"));
  EXPECT_THAT(outcome.output, StrEq(""));
}

TEST_P(PlanSource, IsAFileOrADescriptor) {
  ExpectStarted(RunWith(path));
  const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  lseek(file, 0, SEEK_END);
  ExpectStarted(RunWith(std::to_string(file), {file}));
  close(file);
}

TEST_P(PlanSource, IsReadable) {
  const int file = open(path.c_str(), O_WRONLY | O_CLOEXEC);
  const std::string number = std::to_string(file);
  ExpectRefused(RunWith(number, {file}),
                "cannot read the plan " + number + ": Bad file descriptor");
  ExpectRefused(RunWith("999"), "cannot open the plan 999: Bad file descriptor");
  ExpectRefused(RunWith(path + "x"),
                "cannot open the plan " + path + "x: No such file or directory");
  close(file);
}

TEST_P(PlanSource, IsNoLink) {
  fs::create_symlink(path, tree / "link");
  ExpectRefused(RunWith(tree / "link"),
                "cannot open the plan " + tree / "link" + ": Too many levels of symbolic links");
}

TEST_P(PlanSource, IsARegularFile) {
  ExpectRefused(RunWith(tree.Path()), "the plan " + tree.Path() + " is no regular file");
  ASSERT_EQ(mkfifo((tree / "fifo").c_str(), 0644), 0);
  ExpectRefused(RunWith(tree / "fifo"), "the plan " + tree / "fifo" + " is no regular file");
}

TEST_P(PlanSource, IsNotForOthersToChange) {
  for (const fs::perms open : {fs::perms::group_write, fs::perms::others_write}) {
    fs::permissions(path, open, fs::perm_options::add);
    ExpectRefused(RunWith(path), "the plan " + path +
                                     " can be changed by others; only its owner may write it "
                                     "(chmod go-w)");
    fs::permissions(path, open, fs::perm_options::remove);
  }
  ExpectStarted(RunWith(path));
}

TEST_P(PlanSource, BelongsToRootOrTheUser) {
  if (!CanBe(User::kRoot)) GTEST_SKIP() << "only root can give files away";
  ASSERT_EQ(chown(path.c_str(), 1234, 0), 0);
  const std::string message =
      "the plan " + path + " belongs to user 1234; only root's plans and your own count";
  ExpectRefused(RunWith(path), message);
  ASSERT_EQ(chown(path.c_str(), user == User::kRoot ? 0 : 65534, 0), 0);
  ExpectStarted(RunWith(path));
}

TEST_P(PlanSource, IsWhole) {
  const auto message = [&](const std::string& reason) {
    return "the plan " + path + " cannot be used: " + reason + ". 'secpolicy run' makes a new one";
  };
  const std::string bytes = Enforce::Serialize(PlanOf(tree));
  const auto runWith = [&](const std::string& content) {
    std::ofstream(path, std::ios::binary) << content;
    return RunWith(path);
  };
  ExpectRefused(runWith(""), message("it is no plan"));
  ExpectRefused(runWith(bytes.substr(0, bytes.size() - 1)), message("it is damaged"));
  std::string flipped = bytes;
  flipped[bytes.size() / 2] ^= 1;
  ExpectRefused(runWith(flipped), message("it is damaged"));
  ExpectRefused(runWith(std::string(Enforce::kMostPlanBytes + 1, 's')), message("it is no plan"));
  ExpectStarted(runWith(bytes));
  Enforce::Plan plan = PlanOf(tree);
  plan.mark = std::string(300'000, 'm');
  ExpectStarted(runWith(Enforce::Serialize(plan)));
}

TEST_P(PlanSource, IsOfFilesThatAreThere) {
  Enforce::Plan plan = PlanOf(tree);
  plan.paths.push_back({tree / "gone", Enforce::Landlock::kReadFile});
  ExpectRefused(RunWith(WritePlan(tree, plan)), "the plan is stale: " + tree / "gone" +
                                                    " is gone. 'secpolicy run' makes a new one");
  plan.paths.back().mayBeMissing = true;
  ExpectStarted(RunWith(WritePlan(tree, plan)));
}

TEST_P(PlanSource, LeadsThroughNoLink) {
  Enforce::Plan plan = PlanOfNothing();
  plan.paths.push_back({tree / "open/file", Enforce::Landlock::kReadFile});
  ExpectStarted(RunWith(WritePlan(tree, plan)));

  const std::string message = "the plan is stale: " + tree / "open/file" +
                              " leads through a link. 'secpolicy run' makes a new one";
  fs::remove(tree / "open/file");
  fs::create_symlink(tree / "kept/file", tree / "open/file");
  ExpectRefused(RunWith(path), message);
  fs::remove_all(tree / "open");
  fs::create_symlink(tree / "kept", tree / "open");
  ExpectRefused(RunWith(path), message);
  plan.paths.back().mayBeMissing = true;
  ExpectStarted(RunWith(WritePlan(tree, plan)));
}

TEST_P(PlanSource, IsForThisKernel) {
  const std::string message = "the plan needs more of Landlock than version " +
                              std::to_string(Enforce::Kernel::LandlockVersion()) +
                              ", which this kernel has. 'secpolicy run' makes one for this kernel";
  Enforce::Plan plan = PlanOf(tree);
  plan.handledFiles |= std::uint64_t{1} << 60;
  ExpectRefused(RunWith(WritePlan(tree, plan)), message);
}

TEST_P(PlanSource, HasAFilterThatTheKernelTakes) {
  Enforce::Plan plan = PlanOf(tree);
  plan.filter = {BPF_STMT(BPF_LD | BPF_W | BPF_ABS, 0)};
  ExpectRefused(RunWith(WritePlan(tree, plan)), "cannot filter system calls: Invalid argument");
}

TEST_P(PlanSource, GivesRightsToFilesThatFitThem) {
  Enforce::Plan plan = PlanOfNothing();
  plan.paths.push_back({tree / "kept/file", AllRights()});
  plan.paths.push_back({tree / "open/file", Enforce::Landlock::kReadDir});
  EXPECT_THAT(AnswerOf(user, tree, plan, "read=@/kept/file"), StrEq("ok"));
  EXPECT_THAT(AnswerOf(user, tree, plan, "read=@/open/file"), StrEq("EACCES"));
}

TEST_P(PlanSource, MayHaveNoRightToTheProgram) {
  Enforce::Plan plan = PlanOf(tree);
  plan.paths = {{tree.Path(), AllRights()}};
  ExpectRefused(RunWith(WritePlan(tree, plan)),
                "cannot execute " + ProbePath() + " in the domain testDom: Permission denied");
}

}  // namespace
}  // namespace EnforceTest
