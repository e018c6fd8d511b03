// Ranges of parameter checks: hunts for numbers that are read as others, and for ranges that miss
// or take in a value at their ends.

#include "policy/parameter_range.h"

#include <gtest/gtest.h>

#include "support/message_of.h"

namespace PolicyTest {
namespace {

using Policy::ParseParameterRange;
using SecPolicyTest::MessageOf;

std::string RangeRefusal(const std::string& first, const std::string& last) {
  return MessageOf([&] { ParseParameterRange(first, last); });
}

TEST(ParseParameterRange, ReadsDecimalAndHexadecimalNumbers) {
  const auto range = ParseParameterRange("80", "0x1bB");
  EXPECT_EQ(range.first, 80U);
  EXPECT_EQ(range.last, 443U);
  EXPECT_EQ(ParseParameterRange("0X10", "").first, 16U);
  EXPECT_EQ(ParseParameterRange("0", "18446744073709551615").last, ~std::uint64_t{0});
  EXPECT_EQ(ParseParameterRange("010", "").first, 10U);
}

TEST(ParseParameterRange, IsOneValueWithoutASecondWord) {
  const auto range = ParseParameterRange("80", "");
  EXPECT_EQ(range.first, range.last);
}

TEST(ParseParameterRange, RefusesWhatIsNoNumber) {
  for (const char* word : {"", "x", "-1", "+1", "1 ", " 1", "0x", "0xg", "1.5", "12a", "0x-1"}) {
    EXPECT_EQ(RangeRefusal(word, ""),
              std::string("parameter '") + word + "' is not an unsigned number");
  }
  EXPECT_EQ(RangeRefusal("1", "x"), "parameter 'x' is not an unsigned number");
}

TEST(ParseParameterRange, RefusesNumbersThatDoNotFit) {
  EXPECT_EQ(RangeRefusal("18446744073709551616", ""),
            "parameter '18446744073709551616' is too large");
  EXPECT_EQ(RangeRefusal("0x10000000000000000", ""),
            "parameter '0x10000000000000000' is too large");
}

TEST(ParseParameterRange, RefusesARangeThatRunsBackwards) {
  EXPECT_EQ(RangeRefusal("443", "80"), "parameter range 443 to 80 is empty");
  EXPECT_EQ(RangeRefusal("80", "80"), "");
}

TEST(ParameterRange, OverlapsWhatSharesAValue) {
  struct Pair {
    Policy::ParameterRange one, other;
    bool overlap;
  };
  constexpr Pair kPairs[] = {
      {{80, 80}, {80, 80}, true}, {{80, 90}, {90, 99}, true},  {{80, 90}, {91, 99}, false},
      {{1, 99}, {40, 50}, true},  {{0, 0}, {1, ~0ULL}, false}, {{0, ~0ULL}, {7, 7}, true},
  };
  for (const auto& [one, other, overlap] : kPairs) {
    EXPECT_EQ(one.Overlaps(other), overlap) << one.first << " " << other.first;
    EXPECT_EQ(other.Overlaps(one), overlap) << other.first << " " << one.first;
  }
}

}  // namespace
}  // namespace PolicyTest
