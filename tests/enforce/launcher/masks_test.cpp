// Places where a domain may do less than above them: hunts for a way around a mask, and for one
// that others see. Without a mask each way works.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "host/enforce/features.h"
#include "launch.h"

namespace EnforceTest {
namespace {

using Enforce::Mask;
using Enforce::MaskKind;
using testing::StrEq;

class Masks : public testing::TestWithParam<User> {
 protected:
  void SetUp() override {
    if (!CanBe(user)) GTEST_SKIP() << "only root can start somebody as root";
    if (Lacks()) GTEST_SKIP() << Lacks();
    if (Enforce::ProbeMounts() == Enforce::Namespace::kNone) {
      GTEST_SKIP() << "this system gives nobody a mount namespace";
    }
  }

  std::string AnswerUnder(const std::vector<Mask>& masks, const std::string& operation) const {
    Enforce::Plan plan = PlanOf(tree);
    plan.masks = masks;
    return AnswerOf(user, tree, plan, operation);
  }

  const User user = GetParam();
  const Tree tree{CanBe(GetParam()) ? GetParam() : User::kNobody};
};

INSTANTIATE_TEST_SUITE_P(Users, Masks, testing::Values(User::kRoot, User::kNobody),
                         [](const auto& tested) { return NameOf(tested.param); });

TEST_P(Masks, HideDirectories) {
  const std::vector<Mask> masks = {{tree / "kept", MaskKind::kHidden}};
  const char* const absent = user == User::kRoot ? "ENOENT" : "EACCES";
  for (const char* const operation : {"read=@/kept/file", "run=@/kept/program"}) {
    EXPECT_THAT(AnswerUnder({}, operation), StrEq("ok")) << operation;
    EXPECT_THAT(AnswerUnder(masks, operation), StrEq(absent)) << operation;
  }
  EXPECT_THAT(AnswerUnder(masks, "create=@/kept/new"),
              StrEq(user == User::kRoot ? "EROFS" : "EACCES"));
  EXPECT_THAT(AnswerUnder(masks, "read=@/open/file"), StrEq("ok"));
}

// Sets the limit of open descriptors while it lives, also for what is started.
class DescriptorLimit {
 public:
  explicit DescriptorLimit(rlim_t limit) {
    getrlimit(RLIMIT_NOFILE, &before);
    const rlimit wanted = {limit, before.rlim_max};
    setrlimit(RLIMIT_NOFILE, &wanted);
  }
  DescriptorLimit(const DescriptorLimit&) = delete;
  DescriptorLimit& operator=(const DescriptorLimit&) = delete;
  ~DescriptorLimit() { setrlimit(RLIMIT_NOFILE, &before); }

 private:
  rlimit before{};
};

TEST_P(Masks, MayBeMoreThanFilesMayBeOpen) {
  constexpr rlim_t kOpen = 40;
  for (const char* const path : {"kept", "kept/file"}) {
    const std::vector<Mask> masks(kOpen, {tree / path, MaskKind::kHidden});
    const DescriptorLimit limit(kOpen);
    EXPECT_THAT(AnswerUnder(masks, "read=@/open/file"), StrEq("ok")) << path;
  }
}

TEST_P(Masks, HideFiles) {
  const std::vector<Mask> masks = {{tree / "kept/file", MaskKind::kHidden}};
  for (const char* const operation : {"read=@/kept/file", "write=@/kept/file"}) {
    EXPECT_THAT(AnswerUnder(masks, operation), StrEq("EACCES")) << operation;
    EXPECT_THAT(AnswerUnder({}, operation), StrEq("ok")) << operation;
  }
  EXPECT_THAT(AnswerUnder(masks, "unlink=@/kept/file"), StrEq("EBUSY"));
  EXPECT_THAT(AnswerUnder(masks, "run=@/kept/program"), StrEq("ok"));
}

TEST_P(Masks, KeepFromExecution) {
  const std::vector<Mask> masks = {{tree / "kept", MaskKind::kNoExec}};
  EXPECT_THAT(AnswerUnder({}, "run=@/kept/program"), StrEq("ok"));
  EXPECT_THAT(AnswerUnder(masks, "run=@/kept/program"), StrEq("EACCES"));
  EXPECT_THAT(AnswerUnder(masks, "read=@/kept/program"), StrEq("ok"));
  EXPECT_THAT(AnswerUnder(masks, "write=@/kept/file"), StrEq("ok"));
}

TEST_P(Masks, CannotBeTakenAway) {
  const std::vector<Mask> masks = {{tree / "kept", MaskKind::kNoExec}};
  for (const char* const operation :
       {"unmount=@/kept", "remount=@/kept", "bind-mount=@/open,@/kept"}) {
    EXPECT_THAT(AnswerUnder(masks, operation), StrEq("EPERM")) << operation;
  }
  // In a user namespace one may do with mounts of its own as one likes.
  Enforce::Plan plan = PlanOf(tree);
  plan.masks = masks;
  const Outcome outcome =
      Probe(user, tree, plan, {"unshare-user", "unmount=@/kept", "run=@/kept/program"});
  EXPECT_THAT(outcome.output, StrEq(tree.Resolve("unshare-user ok\nunmount=@/kept EINVAL\n"
                                                 "run=@/kept/program EACCES\n")));
}

// The same without Landlock, which forbids all mounting: what keeps the mask are the capabilities
// that are gone, and the namespace.
TEST_P(Masks, CannotBeTakenAwayWithoutLandlock) {
  Enforce::Plan plan;
  plan.domain = "testDom";
  plan.capabilities = 0;
  plan.masks = {{tree / "kept", MaskKind::kNoExec}};
  const Outcome outcome = Probe(
      user, tree, plan,
      {"unmount=@/kept", "unshare-user", "unmount=@/kept", "remount=@/kept", "run=@/kept/program"});
  EXPECT_THAT(outcome.output,
              StrEq(tree.Resolve("unmount=@/kept EPERM\nunshare-user ok\nunmount=@/kept EINVAL\n"
                                 "remount=@/kept EPERM\nrun=@/kept/program EACCES\n")));
}

TEST(MasksControl, CanBeTakenAwayByWhoMayUnmount) {
  if (!CanBe(User::kRoot)) GTEST_SKIP() << "only root may unmount";
  const Tree tree(User::kRoot);
  Enforce::Plan plan;
  plan.capabilities = ~std::uint64_t{0};
  plan.masks = {{tree / "kept", MaskKind::kNoExec}};
  const Outcome outcome = Probe(User::kRoot, tree, plan,
                                {"run=@/kept/program", "unmount=@/kept", "run=@/kept/program"});
  EXPECT_THAT(outcome.output, StrEq(tree.Resolve("run=@/kept/program EACCES\nunmount=@/kept ok\n"
                                                 "run=@/kept/program ok\n")));
}

TEST_P(Masks, ReachTheWorkingDirectory) {
  Enforce::Plan plan = PlanOf(tree);
  const auto runIn = [&](const char* directory, const char* operation) {
    const std::string before = std::filesystem::current_path();
    std::filesystem::current_path(tree / directory);
    const Outcome outcome = Probe(user, tree, plan, {operation});
    std::filesystem::current_path(before);
    return outcome.errors + outcome.output;
  };
  EXPECT_THAT(runIn("kept", "run=./program"), StrEq("run=./program ok\n"));
  EXPECT_THAT(runIn("kept/directory", "run=../program"), StrEq("run=../program ok\n"));
  plan.masks = {{tree / "kept", MaskKind::kNoExec}};
  EXPECT_THAT(runIn("kept", "run=./program"), StrEq("run=./program EACCES\n"));
  EXPECT_THAT(runIn("kept/directory", "run=../program"), StrEq("run=../program EACCES\n"));
  plan.masks = {{tree / "kept", MaskKind::kHidden}};
  EXPECT_THAT(runIn("kept", "run=./program"),
              StrEq(user == User::kRoot ? "run=./program ENOENT\n" : "run=./program EACCES\n"));
  EXPECT_THAT(runIn("kept/directory", "run=../program"),
              StrEq("secpolicy-run: cannot stay in the directory " + tree / "kept/directory" +
                    ": No such file or directory\n"));
}

TEST_P(Masks, AreNotPassedByDirectoriesThatAreOpen) {
  Enforce::Plan plan = PlanOf(tree);
  const int directory = open(tree.Path().c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
  const int file = open((tree / "open/file").c_str(), O_RDONLY | O_CLOEXEC);
  ASSERT_GE(directory, 0);
  const auto runWith = [&](int kept) {
    const Launch launch{
        .user = user,
        .options = {"--plan", WritePlan(tree, plan), "--keep-fd", std::to_string(kept)},
        .command = {ProbePath(), "is-open=" + std::to_string(kept)},
        .descriptors = {kept}};
    const Outcome outcome = RunLauncher(launch);
    return outcome.errors + outcome.output;
  };
  const std::string opened = "is-open=" + std::to_string(directory) + " ok\n";
  EXPECT_THAT(runWith(directory), StrEq(opened));
  plan.masks = {{tree / "kept", MaskKind::kHidden}};
  EXPECT_THAT(runWith(directory),
              StrEq("secpolicy-run: descriptor " + std::to_string(directory) +
                    " is a directory, which leads past the masks of the domain; start the program "
                    "without it\n"));
  EXPECT_THAT(runWith(file), StrEq("is-open=" + std::to_string(file) + " ok\n"));
  close(file);
  close(directory);
}

std::string Mounts() {
  std::ifstream file("/proc/self/mountinfo");
  return {std::istreambuf_iterator<char>(file), {}};
}

TEST_P(Masks, AreSeenByNobodyElse) {
  const std::string before = Mounts();
  EXPECT_THAT(AnswerUnder({{tree / "kept", MaskKind::kHidden}}, "list=@/open"), StrEq("ok"));
  EXPECT_THAT(Mounts(), StrEq(before));
}

TEST(MasksOfRoot, AreNotShared) {
  if (!CanBe(User::kRoot)) GTEST_SKIP() << "only root may mount";
  if (Lacks()) GTEST_SKIP() << Lacks();
  const Tree tree(User::kRoot);
  InOwnMounts([&] {
    const char* const path = tree.Path().c_str();
    ASSERT_EQ(mount(path, path, nullptr, MS_BIND, nullptr), 0);
    ASSERT_EQ(mount(nullptr, path, nullptr, MS_SHARED, nullptr), 0);
    const std::string before = Mounts();
    ASSERT_THAT(before, testing::HasSubstr(tree.Path()));
    Enforce::Plan plan = PlanOf(tree);
    plan.masks = {{tree / "kept", MaskKind::kNoExec}};
    EXPECT_THAT(AnswerOf(User::kRoot, tree, plan, "run=@/kept/program"), StrEq("EACCES"));
    EXPECT_THAT(Mounts(), StrEq(before));
  });
}

TEST(MasksOfRoot, ReachWhatIsMountedBeneath) {
  if (!CanBe(User::kRoot)) GTEST_SKIP() << "only root may mount";
  if (Lacks()) GTEST_SKIP() << Lacks();
  const Tree tree(User::kRoot);
  InOwnMounts([&] {
    const std::string directory = tree / "kept/directory";
    ASSERT_EQ(mount("none", directory.c_str(), "tmpfs", 0, nullptr), 0);
    std::filesystem::copy_file(tree / "kept/program", directory + "/program");
    Enforce::Plan plan = PlanOf(tree);
    EXPECT_THAT(AnswerOf(User::kRoot, tree, plan, "run=@/kept/directory/program"), StrEq("ok"));
    plan.masks = {{tree / "kept", MaskKind::kNoExec}};
    EXPECT_THAT(AnswerOf(User::kRoot, tree, plan, "run=@/kept/directory/program"), StrEq("EACCES"));
  });
}

TEST_P(Masks, LeaveTheUserAsItIs) {
  const std::vector<Mask> masks = {{tree / "kept", MaskKind::kNoExec}};
  EXPECT_THAT(AnswerUnder(masks, "is-superuser"), StrEq(user == User::kRoot ? "ok" : "EPERM"));
  EXPECT_THAT(AnswerUnder(masks, "has-capability=21"), StrEq(user == User::kRoot ? "ok" : "EPERM"));
}

TEST_P(Masks, AreNotLaidThroughLinks) {
  std::filesystem::create_symlink(tree / "kept", tree / "link");
  Enforce::Plan plan = PlanOf(tree);
  for (const char* const name : {"link", "gone"}) {
    plan.masks = {{tree / name, MaskKind::kHidden}};
    const Outcome outcome = Probe(user, tree, plan, {"read=@/kept/file"});
    EXPECT_TRUE(WIFEXITED(outcome.status));
    EXPECT_EQ(WEXITSTATUS(outcome.status), 126);
    EXPECT_THAT(outcome.output, StrEq(""));
    EXPECT_THAT(outcome.errors,
                testing::StartsWith("secpolicy-run: cannot mask " + tree / name + ": "));
  }
}

}  // namespace
}  // namespace EnforceTest
