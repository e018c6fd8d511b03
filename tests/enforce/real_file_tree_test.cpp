#include "host/enforce/real_file_tree.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <seccomp.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>
#include <initializer_list>
#include <iostream>

#include "braxo/lib/exception.h"
#include "support/temporary_directory.h"

namespace EnforceTest {
namespace {

// From now on the kernel does not know these calls, as far as this process can tell.
void Refuse(std::initializer_list<int> calls) {
  const scmp_filter_ctx filter = seccomp_init(SCMP_ACT_ALLOW);
  for (const int call : calls) {
    if (seccomp_rule_add(filter, SCMP_ACT_ERRNO(ENOSYS), call, 0) != 0) _exit(2);
  }
  if (seccomp_load(filter) != 0) _exit(3);
}

// Ends this process with 0 where the tree says that it cannot look.
[[noreturn]] void LookWithoutAnyCall() {
  Refuse({SCMP_SYS(openat2), SCMP_SYS(openat)});
  try {
    Enforce::RealFileTree().KindOf("/");
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << failure.what();
    _exit(0);
  }
  _exit(1);
}

void ExpectKnownPlaces() {
  Enforce::RealFileTree tree;
  EXPECT_EQ(tree.KindOf("/"), Enforce::FileKind::kDirectory);
  EXPECT_EQ(tree.KindOf("/dev/null"), Enforce::FileKind::kSpecial);
  EXPECT_EQ(tree.KindOf("/etc/passwd"), Enforce::FileKind::kFile);
  EXPECT_EQ(tree.KindOf("/proc/self"), Enforce::FileKind::kLink);
  EXPECT_EQ(tree.KindOf("/proc/self/status"), Enforce::FileKind::kNothing);
  EXPECT_EQ(tree.KindOf("/no/such/place"), Enforce::FileKind::kNothing);
}

// Ends this process with 0 where the tree is the same to it without openat2.
[[noreturn]] void LookNameByName() {
  Refuse({SCMP_SYS(openat2)});
  ExpectKnownPlaces();
  _exit(testing::Test::HasFailure() ? 1 : 0);
}

TEST(RealFileTree, TellsWhatIsThere) { ExpectKnownPlaces(); }

TEST(RealFileTree, LooksNameByNameWhereAFilterIsOlderThanTheCall) {
  EXPECT_EXIT(LookNameByName(), testing::ExitedWithCode(0), "");
}

TEST(RealFileTree, ListsWhatADirectoryHoldsAndNotItself) {
  const SecPolicyTest::TemporaryDirectory directory;
  Enforce::RealFileTree tree;
  EXPECT_THAT(tree.List(directory.Path(), 2), testing::Optional(testing::IsEmpty()));
  for (const char* const name : {"one", ".two"}) std::ofstream(directory / name).put('x');
  EXPECT_THAT(tree.List(directory.Path(), 2),
              testing::Optional(testing::UnorderedElementsAre("one", ".two")));
  EXPECT_EQ(tree.List(directory.Path(), 1), std::nullopt);
  EXPECT_EQ(tree.List(directory / "one", 2), std::nullopt);
}

// As if nothing were there, plans would name no path at all.
TEST(RealFileTree, LeavesNothingOpen) {
  const SecPolicyTest::TemporaryDirectory directory;
  const auto lowest = [] {
    const int file = open("/dev/null", O_RDONLY | O_CLOEXEC);
    close(file);
    return file;
  };
  const int before = lowest();
  Enforce::RealFileTree tree;
  tree.List(directory.Path(), 2);
  tree.KindOf(directory.Path());
  EXPECT_EQ(lowest(), before);
}

TEST(RealFileTree, DoesNotTakeWhatItMayNotLookForAsMissing) {
  EXPECT_EXIT(LookWithoutAnyCall(), testing::ExitedWithCode(0),
              "^Unable to look for /: Function not implemented$");
}

}  // namespace
}  // namespace EnforceTest
