// Refusals that are gathered: hunts for one that is counted twice, or not at all, and for a flood.

#include "refusals/gathering.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>

namespace SecPolicyCli {
namespace {

using Enforce::ModuleEvent;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::SizeIs;

constexpr std::uint64_t kSecond = 1'000'000'000;

ModuleEvent EventAt(std::uint64_t time, std::uint64_t value = 0) {
  ModuleEvent event = {};
  event.time = time;
  event.value = value;
  event.domain = 7;
  event.process = 100 + static_cast<unsigned int>(time % 50);
  std::strcpy(event.program, "program");
  return event;
}

TEST(Gathering, CountsEqualOnesOfASecondOnce) {
  Gathering gathering;
  EXPECT_NE(gathering.Add(EventAt(5), "/file"), nullptr);
  EXPECT_EQ(gathering.Add(EventAt(6), "/file"), nullptr);
  EXPECT_EQ(gathering.Add(EventAt(7), "/file"), nullptr);
  EXPECT_THAT(gathering.TakeUntil(kSecond + 4), IsEmpty());
  const auto taken = gathering.TakeUntil(kSecond + 5);
  ASSERT_THAT(taken, SizeIs(1));
  EXPECT_EQ(taken[0].count, 3U);
  EXPECT_EQ(taken[0].event.time, 5U);
  EXPECT_EQ(taken[0].event.process, 105U);
  EXPECT_EQ(taken[0].path, "/file");
  EXPECT_TRUE(gathering.IsEmpty());
  EXPECT_NE(gathering.Add(EventAt(kSecond + 6), "/file"), nullptr);
}

TEST(Gathering, TellsDifferentOnesApart) {
  Gathering gathering;
  std::vector<ModuleEvent> events(8, EventAt(1));
  events[1].domain = 8;
  events[2].act = 1;
  events[3].detail = 1;
  events[4].value = 1;
  events[5].label = 2;
  events[6].isRefused = 1;
  events[7].program[0] = 'P';
  for (const ModuleEvent& event : events) EXPECT_NE(gathering.Add(event, ""), nullptr);
  EXPECT_NE(gathering.Add(events[0], "/file"), nullptr);
  ModuleEvent ofOther = events[0];
  ofOther.user = 1;
  EXPECT_NE(gathering.Add(ofOther, ""), nullptr);
  EXPECT_EQ(gathering.Add(events[0], ""), nullptr);
  EXPECT_THAT(gathering.TakeAll(), SizeIs(events.size() + 2));
}

TEST(Gathering, KeepsANameWithoutAnEnd) {
  Gathering gathering;
  ModuleEvent event = EventAt(1);
  std::memset(event.program, 'p', sizeof event.program);
  EXPECT_NE(gathering.Add(event, ""), nullptr);
  EXPECT_EQ(gathering.Add(event, ""), nullptr);
}

TEST(Gathering, TakesInOrder) {
  Gathering gathering;
  gathering.Add(EventAt(1, 1), "");
  gathering.Add(EventAt(2, 2), "");
  gathering.Add(EventAt(3, 1), "");
  gathering.Add(EventAt(4, 3), "");
  const auto first = gathering.TakeUntil(kSecond + 2);
  ASSERT_THAT(first, SizeIs(2));
  EXPECT_EQ(first[0].event.value, 1U);
  EXPECT_EQ(first[0].count, 2U);
  EXPECT_EQ(first[1].event.value, 2U);
  const auto last = gathering.TakeAll();
  ASSERT_THAT(last, SizeIs(1));
  EXPECT_EQ(last[0].event.value, 3U);
}

TEST(Gathering, OnlyCountsWhatIsTooMuch) {
  Gathering gathering;
  for (std::uint64_t number = 0; number < Gathering::kMost + 10; ++number)
    gathering.Add(EventAt(1, number), "");
  EXPECT_EQ(gathering.Add(EventAt(2, 0), ""), nullptr);
  const auto taken = gathering.TakeAll();
  EXPECT_THAT(taken, SizeIs(Gathering::kMost));
  EXPECT_EQ(taken[0].count, 2U);
  EXPECT_THAT(gathering.TakeExcess(), ElementsAre(Pair(7U, 10U)));
  EXPECT_THAT(gathering.TakeExcess(), IsEmpty());
  EXPECT_NE(gathering.Add(EventAt(3), ""), nullptr);
}

}  // namespace
}  // namespace SecPolicyCli
