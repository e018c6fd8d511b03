// Hunts phases of a load that get another one's time, or none.

#include "load/load_timing.h"

#include <gtest/gtest.h>

#include <chrono>

namespace {

using SecPolicyCli::Describe;
using SecPolicyCli::LoadTiming;
using std::chrono::milliseconds;

constexpr LoadTiming::Clock::time_point kStart{};

TEST(LoadTiming, GivesEachPhaseTheTimeSinceTheOneBefore) {
  LoadTiming timing(kStart);
  timing.EndPhase("objects", kStart + milliseconds(2));
  timing.EndPhase("domains", kStart + milliseconds(5));
  EXPECT_EQ(timing.Phases(), (std::vector<LoadTiming::Phase>{{"objects", milliseconds(2)},
                                                             {"domains", milliseconds(3)}}));
}

TEST(LoadTiming, AddsUpAPhaseThatEndsAgain) {
  LoadTiming timing(kStart);
  timing.EndPhase("file labels", kStart + milliseconds(1));
  timing.EndPhase("tardisks", kStart + milliseconds(3));
  timing.EndPhase("file labels", kStart + milliseconds(7));
  EXPECT_EQ(timing.Phases(), (std::vector<LoadTiming::Phase>{{"file labels", milliseconds(5)},
                                                             {"tardisks", milliseconds(2)}}));
}

TEST(LoadTiming, KeepsPartsApart) {
  LoadTiming timing(kStart);
  timing.BeginPart("early ");
  timing.EndPhase("objects", kStart + milliseconds(1));
  timing.BeginPart("");
  timing.EndPhase("objects", kStart + milliseconds(3));
  EXPECT_EQ(timing.Phases(), (std::vector<LoadTiming::Phase>{{"early objects", milliseconds(1)},
                                                             {"objects", milliseconds(2)}}));
}

TEST(LoadTiming, IsDescribedWithItsSum) {
  EXPECT_EQ(Describe({{"objects", milliseconds(2)}, {"partner domains", milliseconds(1500)}}),
            "objects           0.0020 s\n"
            "partner domains   1.5000 s\n"
            "all               1.5020 s\n");
  EXPECT_EQ(Describe({}), "all               0.0000 s\n");
}

}  // namespace
