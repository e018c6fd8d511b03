// Sets of values: hunts for a bound that is off by one, above all at 0 and at the greatest value,
// by holding each operation against single bits.

#include "host/enforce/plan/value_set.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <bitset>
#include <random>

#include "enforce/domain_of.h"

namespace EnforceTest {
namespace {

using Enforce::PassingValues;
using Enforce::RulesOfCheck;
using Enforce::ValueRange;
using Enforce::ValueSet;

constexpr std::uint32_t kGreatest = 0xffff'ffff;
using Ranges = std::vector<ValueRange>;

// Sixteen values at both ends stand for all: the rest follows from the ranges in between.
constexpr std::size_t kSamples = 32;
using Samples = std::bitset<kSamples>;

std::uint32_t SampleAt(std::size_t index) {
  const auto number = static_cast<std::uint32_t>(index);
  return index < kSamples / 2 ? number : kGreatest - (kSamples - 1 - number);
}

Samples SamplesOf(const ValueSet& set) {
  Samples samples;
  for (std::size_t index = 0; index < kSamples; ++index) samples[index] = set.Has(SampleAt(index));
  return samples;
}

Samples SamplesOf(const Ranges& ranges) {
  Samples samples;
  for (const ValueRange& range : ranges) {
    for (std::size_t index = 0; index < kSamples; ++index) {
      if (SampleAt(index) >= range.first && SampleAt(index) <= range.last) samples.set(index);
    }
  }
  return samples;
}

Ranges RandomRanges(std::mt19937& random) {
  Ranges ranges;
  for (auto count = random() % 6; count > 0; --count) {
    const std::size_t first = random() % kSamples;
    const std::size_t last = first + random() % (kSamples - first);
    ranges.push_back({SampleAt(first), SampleAt(last)});
  }
  return ranges;
}

void ExpectTidy(const ValueSet& set) {
  for (std::size_t index = 0; index < set.Ranges().size(); ++index) {
    const ValueRange& range = set.Ranges()[index];
    EXPECT_LE(range.first, range.last);
    if (index > 0) {
      EXPECT_GT(range.first, std::uint64_t{set.Ranges()[index - 1].last} + 1);
    }
  }
}

TEST(ValueSet, DoesAsSetsOfBits) {
  std::mt19937 random(20);
  for (int round = 0; round < 2000; ++round) {
    const Ranges ranges = RandomRanges(random);
    const Ranges others = RandomRanges(random);
    const ValueSet set(ranges);
    const ValueSet other(others);
    const Samples bits = SamplesOf(ranges);
    const Samples otherBits = SamplesOf(others);
    ASSERT_EQ(SamplesOf(set), bits) << round;
    ASSERT_EQ(SamplesOf(set.Complement()), ~bits) << round;
    ASSERT_EQ(SamplesOf(set.With(other)), bits | otherBits) << round;
    ASSERT_EQ(SamplesOf(set.Within(other)), bits & otherBits) << round;
    ASSERT_EQ(SamplesOf(set.Without(other)), bits & ~otherBits) << round;
    for (const ValueSet& each : {set, set.Complement(), set.With(other), set.Within(other)}) {
      ExpectTidy(each);
    }
    ASSERT_EQ(set.Count() + set.Complement().Count(), std::uint64_t{1} << 32);
  }
}

TEST(ValueSet, KnowsNothingAndAll) {
  EXPECT_TRUE(ValueSet().IsEmpty());
  EXPECT_FALSE(ValueSet().IsAll());
  EXPECT_TRUE(ValueSet::All().IsAll());
  EXPECT_TRUE(ValueSet().Complement().IsAll());
  EXPECT_TRUE(ValueSet::All().Complement().IsEmpty());
  EXPECT_TRUE(ValueSet({{5, kGreatest}, {0, 4}}).IsAll());
  EXPECT_FALSE(ValueSet({{6, kGreatest}, {0, 4}}).IsAll());
}

ValueSet PassingValuesOf(const std::vector<std::string>& lines) {
  const Policy::InstalledDomain domain = DomainOf(lines);
  return PassingValues(RulesOfCheck(domain.rules, "set_uid"));
}

TEST(PassingValues, AreAllWithoutARule) { EXPECT_TRUE(PassingValuesOf({}).IsAll()); }

TEST(PassingValues, OfOtherChecksSayNothing) {
  EXPECT_TRUE(PassingValuesOf({"-p set_gid 5 grant", "-s setuid revoke"}).IsAll());
}

TEST(PassingValues, AreWhatNoRuleRevokesWhereNoneGrants) {
  EXPECT_EQ(PassingValuesOf({"-p set_uid 0 revoke", "-p set_uid 5 9 revoke"}).Ranges(),
            (Ranges{{1, 4}, {10, kGreatest}}));
}

TEST(PassingValues, AreWhatOneGrantsAndNoneRevokes) {
  EXPECT_EQ(
      PassingValuesOf({"-p set_uid 0 9 grant", "-p set_uid 0x20 grant", "-p set_uid 3 4 revoke"})
          .Ranges(),
      (Ranges{{0, 2}, {5, 9}, {32, 32}}));
}

TEST(PassingValues, EndWhereTheKernelsNumbersEnd) {
  EXPECT_EQ(PassingValuesOf({"-p set_uid 0xfffffffe 0x1ffffffff grant"}).Ranges(),
            (Ranges{{0xffff'fffe, kGreatest}}));
  EXPECT_TRUE(PassingValuesOf({"-p set_uid 0x100000000 grant"}).IsEmpty());
  EXPECT_TRUE(PassingValuesOf({"-p set_uid 0x100000000 revoke"}).IsAll());
}

}  // namespace
}  // namespace EnforceTest
