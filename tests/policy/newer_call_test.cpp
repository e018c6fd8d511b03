// Hunts a system call whose number is that of another one, or that is left out.

#include "policy/newer_call.h"

#include <gtest/gtest.h>

#include <set>
#include <string_view>

namespace PolicyTest {
namespace {

TEST(NewerCalls, HaveNumbersThatFollowOneAnother) {
  int number = Policy::NewerCalls().front().number;
  std::set<std::string_view> names;
  for (const Policy::NewerCall& call : Policy::NewerCalls()) {
    EXPECT_EQ(call.number, number++) << call.name;
    EXPECT_TRUE(names.insert(call.name).second) << call.name;
  }
}

}  // namespace
}  // namespace PolicyTest
