#include "host/enforce/real_file_tree.h"

#include <gtest/gtest.h>
#include <seccomp.h>
#include <unistd.h>

#include <cerrno>
#include <iostream>

#include "braxo/lib/exception.h"

namespace EnforceTest {
namespace {

// Ends this process, which may no longer call openat2, with 0 where the tree says so.
[[noreturn]] void LookWithoutTheCall() {
  const scmp_filter_ctx filter = seccomp_init(SCMP_ACT_ALLOW);
  if (seccomp_rule_add(filter, SCMP_ACT_ERRNO(ENOSYS), SCMP_SYS(openat2), 0) != 0) _exit(2);
  if (seccomp_load(filter) != 0) _exit(3);
  try {
    Enforce::RealFileTree().KindOf("/");
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << failure.what();
    _exit(0);
  }
  _exit(1);
}

TEST(RealFileTree, TellsWhatIsThere) {
  Enforce::RealFileTree tree;
  EXPECT_EQ(tree.KindOf("/"), Enforce::FileKind::kDirectory);
  EXPECT_EQ(tree.KindOf("/dev/null"), Enforce::FileKind::kFile);
  EXPECT_EQ(tree.KindOf("/no/such/place"), Enforce::FileKind::kNothing);
}

// As if nothing were there, plans would name no path at all.
TEST(RealFileTree, DoesNotTakeWhatItMayNotLookForAsMissing) {
  EXPECT_EXIT(LookWithoutTheCall(), testing::ExitedWithCode(0),
              "^Unable to look for /: Function not implemented$");
}

}  // namespace
}  // namespace EnforceTest
