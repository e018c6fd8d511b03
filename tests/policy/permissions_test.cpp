// Permissions: hunts for letters and bits that do not belong together, and for letters that should
// have been refused.

#include "policy/permissions.h"

#include <gtest/gtest.h>

#include "support/message_of.h"

namespace PolicyTest {
namespace {

using Policy::Permission;
using Policy::Permissions;
using SecPolicyTest::MessageOf;

TEST(Permissions, AreLettersAndBits) {
  const std::pair<const char*, unsigned int> pairs[] = {{"", 0},      {"r", 0x1},   {"w", 0x2},
                                                        {"rw", 0x3},  {"x", 0x10},  {"rx", 0x11},
                                                        {"wx", 0x12}, {"rwx", 0x13}};
  for (const auto& [letters, bits] : pairs) {
    EXPECT_EQ(Permissions::Parse(letters).Bits(), bits);
    EXPECT_EQ(Permissions(bits).Text(), letters);
    EXPECT_EQ(Permissions(bits).IsEmpty(), bits == 0);
  }
  EXPECT_EQ(Permissions::Parse("xwr").Bits(), Permissions::kAllBits);
}

TEST(Permissions, RefuseOtherLettersAndRepetitions) {
  for (const char* letters : {"R", "rr", "rwxr", "rwa", " ", "r "}) {
    EXPECT_EQ(
        MessageOf([&] { Permissions::Parse(letters); }),
        std::string("permissions '") + letters + "' must be letters of \"rwx\", each at most once");
  }
}

TEST(Permissions, AreGivenOneByOne) {
  const Permissions some = Permissions::Parse("rx");
  EXPECT_TRUE(some.Has(Permission::kRead));
  EXPECT_FALSE(some.Has(Permission::kWrite));
  EXPECT_TRUE(some.Has(Permission::kExecute));
  EXPECT_EQ(some.With(Permission::kWrite).Text(), "rwx");
  EXPECT_EQ(some.With(Permission::kRead), some);
}

}  // namespace
}  // namespace PolicyTest
