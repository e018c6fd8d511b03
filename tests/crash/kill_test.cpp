// Loaders and boots that are killed at any moment.

#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <random>
#include <set>

#include "command.h"
#include "host_root.h"
#include "recorded_load.h"
#include "state_content.h"

namespace CrashTest {
namespace {

using Microseconds = std::chrono::microseconds;

const std::vector<std::string> kLoad = {"load"};
const std::vector<std::string> kBoot = {"boot"};
const std::vector<std::string> kDisplay = {"display"};

Microseconds TimeOf(const std::filesystem::path& root, const std::vector<std::string>& arguments) {
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(RunCommand(root, arguments).exitStatus, 0);
  return std::chrono::duration_cast<Microseconds>(std::chrono::steady_clock::now() - start);
}

// Starts the command and kills it at a random moment of the time that it takes.
void RunAndKill(const std::filesystem::path& root, const std::vector<std::string>& arguments,
                Microseconds time, std::mt19937& random) {
  Command command(root, arguments);
  std::uniform_int_distribution<Microseconds::rep> moment(0, time.count());
  usleep(static_cast<useconds_t>(moment(random)));
  command.Kill();
  command.Wait();
}

std::string IntegrityOf(const std::filesystem::path& state) {
  return std::filesystem::exists(state) ? StateFile(state).Integrity() : "ok";
}

TEST(RecordedLoad, MakesOneStepOfEachCall) {
  constexpr std::size_t kDomains = kServices + 4;
  constexpr std::size_t kRulesOfAService = 12 + 3 + 1 + 1 + 5 + kLinks + 4 + 1;
  constexpr std::size_t kRoles = 3;
  // Nothing, the new state, the labels, and how tardisks are entered from two domains.
  constexpr std::size_t kOthers = 5;
  const HostRoot root;
  EXPECT_EQ(RecordLoad(root).size(),
            kOthers + kDomains + 4 + kServices * kRulesOfAService + kRoles);
}

TEST(KilledLoad, HasInstalledNothingOrAllOfItAndTheNextOneEndsRight) {
  const HostRoot root;
  const std::vector<std::string> contents = RecordLoad(root);
  ASSERT_GT(contents.size(), 2U);
  // No state, and a new one.
  const std::set<std::string> nothing = {contents[0], contents[1]};
  const std::string& all = contents.back();
  const Microseconds time = TimeOf(root.Path(), kLoad);
  ASSERT_EQ(ContentOf(root.State()), all);

  const int rounds = LongTests() ? 400 : 20;
  int early = 0;
  std::mt19937 random(20);
  for (int round = 0; round < rounds; ++round) {
    root.Forget();
    RunAndKill(root.Path(), kLoad, time, random);

    // Half of the time the host is the first one to open what was left behind.
    if (round % 2 == 0) {
      const int expected = std::filesystem::exists(root.State()) ? 0 : 1;
      ASSERT_EQ(RunCommand(root.Path(), kDisplay).exitStatus, expected);
    }
    ASSERT_EQ(IntegrityOf(root.State()), "ok");
    const std::string left = ContentOf(root.State());
    ASSERT_TRUE(left == all || nothing.contains(left)) << left;
    if (left != all) ++early;

    const Outcome next = RunCommand(root.Path(), kLoad);
    ASSERT_EQ(next.exitStatus, 0) << next.errors;
    ASSERT_EQ(ContentOf(root.State()), all);
    ASSERT_EQ(IntegrityOf(root.State()), "ok");
  }
  ::testing::Test::RecordProperty("killed", rounds);
  ::testing::Test::RecordProperty("killed_early", early);
  EXPECT_GT(early, 0);
}

TEST(KilledLoad, OfAnInstalledPolicyTakesNothingAway) {
  const HostRoot root;
  const Microseconds time = TimeOf(root.Path(), kLoad);
  const std::string display = RunCommand(root.Path(), kDisplay).output;
  std::mt19937 random(21);
  for (int round = 0; round < (LongTests() ? 100 : 10); ++round) {
    RunAndKill(root.Path(), kLoad, time, random);
    ASSERT_EQ(IntegrityOf(root.State()), "ok");
    const std::string left = RunCommand(root.Path(), kDisplay).output;
    ASSERT_EQ(std::count(left.begin(), left.end(), '\n'),
              std::count(display.begin(), display.end(), '\n'))
        << left;
  }
  ASSERT_EQ(RunCommand(root.Path(), kLoad).exitStatus, 0);
  EXPECT_EQ(RunCommand(root.Path(), kDisplay).output, display);
}

TEST(KilledBoot, IsMadeGoodByTheNextOne) {
  const HostRoot root;
  const std::string pack = std::string(PACK_EXAMPLE) + " " + root.Path().string();
  ASSERT_EQ(std::system(pack.c_str()), 0);
  const Microseconds time = TimeOf(root.Path(), kBoot);
  const std::string content = ContentOf(root.State());
  std::mt19937 random(22);
  for (int round = 0; round < (LongTests() ? 100 : 10); ++round) {
    if (round % 2 == 0) root.Forget();
    RunAndKill(root.Path(), kBoot, time, random);
    ASSERT_EQ(IntegrityOf(root.State()), "ok");

    const Outcome next = RunCommand(root.Path(), kBoot);
    ASSERT_EQ(next.exitStatus, 0) << next.errors;
    ASSERT_EQ(ContentOf(root.State()), content);
    ASSERT_EQ(RunCommand(root.Path(), kDisplay).exitStatus, 0);
  }
}

}  // namespace
}  // namespace CrashTest
