// System calls by name and number: hunts for a name that goes one way and not back, and for a
// number that is not the kernel's.

#include "host/enforce/system_calls.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/audit.h>
#include <sys/syscall.h>

#include "policy/call_set.h"

namespace EnforceTest {
namespace {

using Enforce::NameOf;
using Enforce::NumberOf;
using Enforce::SystemCall;
using Enforce::SystemCalls;

TEST(SystemCalls, AreThoseOfTheKernelHeaders) {
  EXPECT_EQ(NumberOf("read"), SYS_read);
  EXPECT_EQ(NumberOf("execveat"), SYS_execveat);
  EXPECT_EQ(NumberOf("clone3"), SYS_clone3);
  EXPECT_EQ(NumberOf("landlock_restrict_self"), SYS_landlock_restrict_self);
}

TEST(SystemCalls, HaveThoseThatAreNewerThanTheLibrary) {
  EXPECT_EQ(NumberOf("fchmodat2"), 452);
  EXPECT_EQ(NumberOf("setxattrat"), 463);
  EXPECT_EQ(NumberOf("file_setattr"), 469);
  EXPECT_EQ(NameOf(466), "removexattrat");
}

TEST(SystemCalls, AreInAscendingOrder) {
  EXPECT_GT(SystemCalls().size(), 300U);
  EXPECT_TRUE(
      std::ranges::is_sorted(SystemCalls(), std::ranges::less_equal(), &SystemCall::number));
}

TEST(SystemCalls, GoBothWays) {
  for (const auto& [number, name] : SystemCalls()) {
    EXPECT_EQ(NumberOf(name), number) << name;
    EXPECT_EQ(NameOf(number), name);
  }
}

TEST(SystemCalls, KnowNothingElse) {
  EXPECT_EQ(NumberOf("reed"), std::nullopt);
  EXPECT_EQ(NumberOf(""), std::nullopt);
  EXPECT_EQ(NumberOf("@start"), std::nullopt);
  EXPECT_EQ(NumberOf("zzz"), std::nullopt);
  EXPECT_EQ(NameOf(-1), "");
  EXPECT_EQ(NameOf(1023), "");
}

TEST(SystemCalls, AreOfTheArchitectureThatTheKernelTells) {
#if defined(__x86_64__)
  EXPECT_EQ(Enforce::NativeArchitecture(), AUDIT_ARCH_X86_64);
#elif defined(__aarch64__)
  EXPECT_EQ(Enforce::NativeArchitecture(), AUDIT_ARCH_AARCH64);
#else
  GTEST_SKIP() << "filters are for x86_64 and aarch64";
#endif
}

}  // namespace
}  // namespace EnforceTest
