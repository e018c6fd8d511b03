// Refusals as they are noted and read again: hunts for one that is read as another.

#include "refusals/refused_act.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace SecPolicyCli {
namespace {

RefusedAct SomeAct() {
  return {.time = 1'795'359'600,
          .count = 3,
          .domain = "sshDom",
          .isRefused = false,
          .question = {"write", "/etc/with blanks"},
          .path = "/etc/with blanks",
          .label = "sshKey",
          .process = {.id = 812,
                      .parent = 7,
                      .user = 33,
                      .program = "sshd",
                      .path = "/usr/sbin/sshd",
                      .parentProgram = "/bin/sh"}};
}

std::string LineOf(const RefusedAct& refused) { return ToJson(refused).Line() + "\n"; }

TEST(RefusedAct, IsReadAsItWasWritten) {
  const RefusedAct written = SomeAct();
  const auto read = FindLatest(LineOf(written), "");
  ASSERT_TRUE(read.has_value());
  EXPECT_EQ(read->time, written.time);
  EXPECT_EQ(read->question, written.question);
  EXPECT_EQ(TextOf(*read), TextOf(written));
  EXPECT_EQ(ToJson(*read), ToJson(written));
}

TEST(RefusedAct, IsReadWithoutAQuestion) {
  RefusedAct written = SomeAct();
  written.question.clear();
  written.act = "reach what enforces the policy";
  written.isOfNoRule = true;
  written.isRefused = true;
  written.label.clear();
  written.process.path.clear();
  const auto read = FindLatest(LineOf(written), "");
  ASSERT_TRUE(read.has_value());
  EXPECT_TRUE(read->isOfNoRule);
  EXPECT_EQ(TextOf(*read),
            "sshDom was refused: reach what enforces the policy, by sshd, process 812 of user 33, "
            "3 times");
}

TEST(FindLatest, FindsTheLatestOfADomain) {
  RefusedAct first = SomeAct();
  RefusedAct other = SomeAct();
  first.count = 1;
  other.domain = "appDom";
  const std::string lines = LineOf(SomeAct()) + LineOf(first) + LineOf(other);
  EXPECT_EQ(FindLatest(lines, "")->domain, "appDom");
  EXPECT_EQ(FindLatest(lines, "sshDom")->count, 1);
  EXPECT_FALSE(FindLatest(lines, "noDom").has_value());
}

TEST(FindLatest, PassesOverWhatIsNoRefusal) {
  const std::string one = LineOf(SomeAct());
  for (const char* const line :
       {"\n", "text\n", "7\n", "[]\n", "{}\n", "{\"domain\": \"sshDom\"}\n", "{\"act\": \"a\"}\n",
        "{\"domain\": 7, \"act\": \"a\"}\n", "{"}) {
    EXPECT_FALSE(FindLatest(line, "").has_value()) << line;
    EXPECT_TRUE(FindLatest(one + line, "").has_value()) << line;
  }
  EXPECT_FALSE(FindLatest("", "").has_value());
}

}  // namespace
}  // namespace SecPolicyCli
