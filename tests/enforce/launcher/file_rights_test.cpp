// Programs that are kept from files: hunts for a way to a file that no rule gives. Each way is
// tried twice, with one right missing and with all of them: who is refused without the reason that
// the right is missing, is refused the second time too.

#include <gmock/gmock.h>

#include "host/enforce/kernel.h"
#include "launch.h"

namespace EnforceTest {
namespace {

using testing::StrEq;
namespace Landlock = Enforce::Landlock;

// What is tried, and of which rights to "kept" at least one is missing when it is refused.
struct Way {
  const char* name;
  const char* operation;
  std::uint64_t missing;
  const char* refusal;
  bool needsRoot = false;
};

constexpr Way kWays[] = {
    {"Read", "read=@/kept/file", Landlock::kReadFile, "EACCES"},
    {"ReadByDots", "read=@/open/../kept/file", Landlock::kReadFile, "EACCES"},
    {"ReadByOwnRoot", "read=/proc/self/root@/kept/file", Landlock::kReadFile, "EACCES"},
    {"Write", "write=@/kept/file", Landlock::kWriteFile, "EACCES"},
    {"OpenTruncate", "open-truncate=@/kept/file", Landlock::kTruncate, "EACCES"},
    {"Truncate", "truncate=@/kept/file", Landlock::kTruncate, "EACCES"},
    {"TruncateOpen", "ftruncate=@/kept/file", Landlock::kTruncate, "EACCES"},
    {"Create", "create=@/kept/new", Landlock::kMakeReg, "EACCES"},
    {"LinkNameless", "link-nameless=@/kept,@/kept/new", Landlock::kMakeReg, "EACCES"},
    {"MakeNameless", "link-nameless=@/kept,@/kept/new", Landlock::kWriteFile, "EACCES"},
    {"MakeDirectory", "mkdir=@/kept/new", Landlock::kMakeDir, "EACCES"},
    {"MakeLink", "symlink=@/kept/new", Landlock::kMakeSym, "EACCES"},
    {"MakeFifo", "mkfifo=@/kept/new", Landlock::kMakeFifo, "EACCES"},
    {"MakeFile", "mknod-file=@/kept/new", Landlock::kMakeReg, "EACCES"},
    {"MakeSocket", "mknod-socket=@/kept/new", Landlock::kMakeSock, "EACCES"},
    {"BindSocket", "bind-unix=@/kept/new", Landlock::kMakeSock, "EACCES"},
    {"MakeCharacterDevice", "mknod-character=@/kept/new", Landlock::kMakeChar, "EACCES", true},
    {"MakeBlockDevice", "mknod-block=@/kept/new", Landlock::kMakeBlock, "EACCES", true},
    {"RemoveFile", "unlink=@/kept/file", Landlock::kRemoveFile, "EACCES"},
    {"RemoveDirectory", "rmdir=@/kept/directory", Landlock::kRemoveDir, "EACCES"},
    {"RenameOut", "rename=@/kept/file,@/open/new", Landlock::kRefer, "EXDEV"},
    {"RenameIn", "rename=@/open/file,@/kept/new", Landlock::kRefer, "EXDEV"},
    {"RenameToMoreRights", "rename=@/kept/file,@/open/new", Landlock::kReadFile, "EXDEV"},
    {"LinkToMoreRights", "link=@/kept/file,@/open/new", Landlock::kReadFile, "EXDEV"},
    {"LinkOut", "link=@/kept/file,@/open/new", Landlock::kRefer, "EXDEV"},
    {"Exchange", "exchange=@/kept/file,@/open/file", Landlock::kRefer, "EXDEV"},
    {"ExchangeForMoreRights", "exchange=@/kept/file,@/open/file", Landlock::kWriteFile, "EXDEV"},
    {"ExchangeWithin", "exchange=@/kept/file,@/kept/program", Landlock::kRemoveFile, "EACCES"},
    {"List", "list=@/kept", Landlock::kReadDir, "EACCES"},
    {"Execute", "run=@/kept/program", Landlock::kExecute, "EACCES"},
    {"ExecuteByDescriptor", "run-by-descriptor=@/kept/program", Landlock::kExecute, "EACCES"},
};

struct Try {
  User user;
  Way way;
};

std::vector<Try> AllTries() {
  std::vector<Try> tries;
  for (const Way& way : kWays) {
    tries.push_back({User::kRoot, way});
    if (!way.needsRoot) tries.push_back({User::kNobody, way});
  }
  return tries;
}

class FileRights : public testing::TestWithParam<Try> {};

Enforce::Plan PlanWithout(std::uint64_t missing, const Tree& tree) {
  Enforce::Plan plan = PlanOfNothing();
  plan.paths.push_back({tree / "open", AllRights()});
  plan.paths.push_back({tree / "kept", AllRights() & ~missing});
  return plan;
}

std::string Answer(const Try& tried, std::uint64_t missing) {
  const Tree tree(tried.user);
  return AnswerOf(tried.user, tree, PlanWithout(missing, tree), tried.way.operation);
}

TEST_P(FileRights, AreRefusedAndGiven) {
  const Try& tried = GetParam();
  if (!CanBe(tried.user)) GTEST_SKIP() << "only root can start somebody as root";
  if (Lacks()) GTEST_SKIP() << Lacks();
  if ((tried.way.missing & ~AllRights()) != 0) {
    GTEST_SKIP() << "version " << Enforce::Kernel::LandlockVersion()
                 << " of Landlock has no such right";
  }
  EXPECT_THAT(Answer(tried, tried.way.missing), StrEq(tried.way.refusal));
  EXPECT_THAT(Answer(tried, 0), StrEq("ok"));
}

std::string NameOfTry(const testing::TestParamInfo<Try>& tried) {
  return tried.param.way.name + NameOf(tried.param.user);
}

INSTANTIATE_TEST_SUITE_P(Ways, FileRights, testing::ValuesIn(AllTries()), NameOfTry);

}  // namespace
}  // namespace EnforceTest
