// A state that is damaged, of another version, or not the user's own.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "braxo/lib/exception.h"
#include "command.h"
#include "host_root.h"
#include "state_content.h"
#include "teskctl/security.h"

namespace CrashTest {
namespace {

constexpr char kUseless[] = "Unable to use the host state /run/secpolicy/host.db: it ";
constexpr char kMakeANewOne[] =
    ". Remove the file and run \"secpolicy boot\", which makes a new one\n";
constexpr uid_t kSomebody = 12345;

std::string DescribeOf(const std::filesystem::path& path) {
  struct stat status {};
  lstat(path.c_str(), &status);
  const std::string kind = std::to_string(status.st_mode) + " " + std::to_string(status.st_uid);
  return S_ISREG(status.st_mode) ? kind + "\n" + ReadFile(path) : kind;
}

// What the host says to an ordinary user who finds the state in `directory`.
std::string MessageToSomebody(const std::filesystem::path& directory) {
  const std::filesystem::path answer = directory / "answer";
  const pid_t child = fork();
  if (child == 0) {
    if (geteuid() == 0 && setuid(kSomebody) != 0) _exit(1);
    setenv("SECPOLICY_HOST_STATE", (directory / "host.db").c_str(), 1);
    try {
      unsigned int id = 0;
      TeskCtl::Security::TeskAccessInterfaceImpl().FindDomain("hostDom", &id);
    } catch (const Braxo::Lib::BraxoException& failure) {
      WriteFile(answer, failure.what());
    }
    _exit(0);
  }
  waitpid(child, nullptr, 0);
  return ReadFile(answer);
}

struct Fault {
  const char* name;
  std::function<void(const std::filesystem::path& state)> make;
  std::string message;
};

const std::string kChmod = ". Take that right from them (chmod go-w), or choose another place\n";

const std::vector<Fault> kFaults = {
    {"ItIsOfANewerSchema",
     [](const auto& state) { StateFile(state).Execute("PRAGMA user_version = 7"); },
     std::string(kUseless) +
         "has schema 7, this program works with schema 6: it was made by another version of it" +
         kMakeANewOne},
    {"ItWasCutOff",
     [](const auto& state) {
       std::filesystem::resize_file(state, std::filesystem::file_size(state) / 2);
     },
     std::string(kUseless) + "is damaged or no such thing (database disk image is malformed)" +
         kMakeANewOne},
    {"ItWasCutOffInTheHeader", [](const auto& state) { std::filesystem::resize_file(state, 50); },
     std::string(kUseless) + "is damaged or no such thing (database disk image is malformed)" +
         kMakeANewOne},
    {"ItsHeaderIsOverwritten",
     [](const auto& state) {
       std::string content = ReadFile(state);
       content.replace(0, 16, 16, '\xff');
       WriteFile(state, content);
     },
     std::string(kUseless) + "is damaged or no such thing (file is not a database)" + kMakeANewOne},
    {"ItIsADirectory",
     [](const auto& state) {
       std::filesystem::remove(state);
       std::filesystem::create_directory(state);
     },
     "Refusing the host state: /run/secpolicy/host.db is not a regular file. Remove it, or choose "
     "another place\n"},
    {"OthersMayWriteIt", [](const auto& state) { chmod(state.c_str(), 0666); },
     "Refusing the host state: other users may write /run/secpolicy/host.db" + kChmod},
    {"OthersMayWriteItsDirectory",
     [](const auto& state) { chmod(state.parent_path().c_str(), 0777); },
     "Refusing the host state: other users may write /run/secpolicy" + kChmod},
    {"AnotherUserOwnsIt",
     [](const auto& state) {
       if (chown(state.c_str(), kSomebody, kSomebody) != 0) GTEST_SKIP() << "needs root";
     },
     "Refusing the host state: /run/secpolicy/host.db belongs to another user. Remove it, or "
     "choose another place\n"},
    {"AnotherUserOwnsItsDirectory",
     [](const auto& state) {
       const std::filesystem::path directory = state.parent_path();
       if (chown(directory.c_str(), kSomebody, kSomebody) != 0) GTEST_SKIP() << "needs root";
     },
     "Refusing the host state: /run/secpolicy belongs to another user. Remove it, or choose "
     "another place\n"},
};

class StateFault : public ::testing::TestWithParam<Fault> {};

TEST_P(StateFault, IsToldAndLeavesTheFileAlone) {
  const HostRoot root;
  ASSERT_EQ(RunCommand(root.Path(), {"load"}).exitStatus, 0);
  GetParam().make(root.State());
  if (IsSkipped()) return;
  const std::string before = DescribeOf(root.State());

  for (const char* verb : {"display", "load"}) {
    const Outcome outcome = RunCommand(root.Path(), {verb});
    EXPECT_EQ(outcome.exitStatus, 1);
    EXPECT_EQ(outcome.errors, std::string("secpolicy: ") + verb + ": " + GetParam().message);
    EXPECT_EQ(DescribeOf(root.State()), before);
  }
}

INSTANTIATE_TEST_SUITE_P(Because, StateFault, ::testing::ValuesIn(kFaults),
                         [](const auto& fault) { return std::string(fault.param.name); });

TEST(DamagedState, NeverCrashesAndIsLeftAloneWhenItIsRead) {
  const HostRoot root;
  ASSERT_EQ(RunCommand(root.Path(), {"load"}).exitStatus, 0);
  const std::string whole = ReadFile(root.State());
  std::mt19937 random(23);
  std::uniform_int_distribution<std::size_t> anywhere(0, whole.size() - 1);

  const std::size_t rounds = LongTests() ? 1000 : 60;
  std::size_t refused = 0;
  for (std::size_t round = 0; round < rounds; ++round) {
    // The head of the file, the head of each page, and anywhere.
    constexpr std::size_t kPage = 4096;
    const std::size_t offset = round % 3 == 0   ? round % 100
                               : round % 3 == 1 ? round * kPage % whole.size() + round % 8
                                                : anywhere(random);
    SCOPED_TRACE("the byte at " + std::to_string(offset));
    std::string damaged = whole;
    damaged[offset] = static_cast<char>(~damaged[offset]);
    WriteFile(root.State(), damaged);

    const Outcome display = RunCommand(root.Path(), {"display"});
    ASSERT_GE(display.exitStatus, 0);
    EXPECT_EQ(ReadFile(root.State()), damaged);
    const Outcome load = RunCommand(root.Path(), {"load"});
    ASSERT_GE(load.exitStatus, 0);
    if (display.exitStatus != 0) {
      ++refused;
      EXPECT_THAT(display.errors,
                  ::testing::HasSubstr("Remove the file and run \"secpolicy boot\""));
    }
    // Damage inside a record is a wrong record only, and a load then says what it did not fit to.
    if (load.exitStatus != 0) {
      EXPECT_THAT(load.errors, ::testing::HasSubstr("secpolicy: load: "));
    }
    for (const char* suffix : {"-wal", "-shm"}) {
      std::filesystem::remove(root.State().string() + suffix);
    }
  }
  EXPECT_GT(refused, 0U);
}

// What a killed process leaves beside the database must not get into the new one.
TEST(DamagedState, IsMadeGoodByWhatTheMessageSays) {
  const HostRoot root;
  ASSERT_EQ(RunCommand(root.Path(), {"boot"}).exitStatus, 0);
  const std::string content = ContentOf(root.State());
  for (int round = 0; round < 5; ++round) {
    Command loader(root.Path(), {"load"});
    usleep(20'000);
    loader.Kill();
    loader.Wait();
    WriteFile(root.State(), std::string(8192, 'x'));
    const Outcome refused = RunCommand(root.Path(), {"load"});
    ASSERT_EQ(refused.exitStatus, 1);
    ASSERT_NE(refused.errors.find("Remove the file and run \"secpolicy boot\""), std::string::npos)
        << refused.errors;

    std::filesystem::remove(root.State());
    const Outcome boot = RunCommand(root.Path(), {"boot"});
    ASSERT_EQ(boot.exitStatus, 0) << boot.errors;
    EXPECT_EQ(StateFile(root.State()).Integrity(), "ok");
    EXPECT_EQ(ContentOf(root.State()), content);
  }
}

TEST(UnwritableState, IsToldToItsOwnerAndLeftAlone) {
  const HostRoot root;
  ASSERT_EQ(RunCommand(root.Path(), {"load"}).exitStatus, 0);
  const std::filesystem::path directory = root.State().parent_path();
  ASSERT_EQ(chmod(root.Path().c_str(), 0755), 0);
  ASSERT_EQ(chmod(root.State().c_str(), 0400), 0);
  if (geteuid() == 0) {
    ASSERT_EQ(chown(directory.c_str(), kSomebody, kSomebody), 0);
    ASSERT_EQ(chown(root.State().c_str(), kSomebody, kSomebody), 0);
  }
  const std::string before = DescribeOf(root.State());

  EXPECT_EQ(MessageToSomebody(directory),
            "Unable to use the host state " + root.State().string() +
                ": it cannot be written. Make it writable, or choose another place");
  EXPECT_EQ(DescribeOf(root.State()), before);
}

TEST(MissingRun, IsToldByWhatNeedsItAndMadeByBoot) {
  const HostRoot root;
  std::filesystem::remove(root.Path() / "run");
  for (const char* verb : {"display", "load"}) {
    const Outcome outcome = RunCommand(root.Path(), {verb});
    EXPECT_EQ(outcome.exitStatus, 1);
    EXPECT_EQ(outcome.errors,
              std::string("secpolicy: ") + verb +
                  ": nothing is installed below this root. Name the root that was booted "
                  "(--root DIR), or run 'secpolicy --root " +
                  root.Path().string() + " boot' first.\n");
    EXPECT_FALSE(std::filesystem::exists(root.Path() / "run"));
  }
  EXPECT_EQ(RunCommand(root.Path(), {"boot"}).exitStatus, 0);
  EXPECT_TRUE(std::filesystem::exists(root.State()));
}

}  // namespace
}  // namespace CrashTest
