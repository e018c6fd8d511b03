// What users say of their processes: hunts for a record that speaks of another's process, or of a
// later one with the same number, and for what keeps a user from making one.
#include "host/linux/operation/world_records.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

#include "child_process.h"
#include "host/linux/common/process.h"
#include "host/linux/operation/world_entry.h"
#include "host/linux/state/host_state.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

namespace fs = std::filesystem;

using LinuxHost::HostState;
using LinuxHost::WorldRecord;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;

constexpr uid_t kUser = 7;

class WorldRecords : public ::testing::Test {
 protected:
  void SetUp() override { LinuxHost::MakeWorldRecords(); }

  static std::vector<std::string> Texts() {
    std::vector<std::string> texts;
    for (const WorldRecord& record : LinuxHost::ReadWorldRecords()) {
      texts.push_back(std::to_string(record.id) + " " + record.domain + " " + record.level);
    }
    return texts;
  }

  // The files of all records.
  std::vector<std::string> Files() const {
    std::vector<std::string> files;
    for (const auto& entry : fs::recursive_directory_iterator(worlds)) {
      if (!entry.is_directory()) files.push_back(entry.path());
    }
    return files;
  }

  // A record by hand, of the user's.
  void Write(const std::string& name, const std::string& content) const {
    const std::string user = worlds + "/" + std::to_string(kUser) + ".abcdef";
    fs::create_directory(user);
    std::ofstream(user + "/" + name) << content;
    ASSERT_EQ(chown(user.c_str(), kUser, kUser), 0);
    ASSERT_EQ(chown((user + "/" + name).c_str(), kUser, kUser), 0);
  }

  static std::string Content(pid_t process) {
    return std::to_string(LinuxHost::StartOf(process)) + " enforcing a";
  }

  StateDirectory directory;
  const std::string worlds = directory.Path() + "/worlds";
};

TEST_F(WorldRecords, AreReadAsTheyWereMade) {
  LinuxHost::RecordWorld("a domain\n of mine", "enforcing");
  EXPECT_EQ(Texts(),
            std::vector<std::string>{std::to_string(getpid()) + " a domain\n of mine enforcing"});
  LinuxHost::RecordWorld("another", "disabled");
  EXPECT_EQ(Texts(), std::vector<std::string>{std::to_string(getpid()) + " another disabled"});
  EXPECT_EQ(Files().size(), 1U);
}

TEST_F(WorldRecords, AreInADirectoryWithTheNumberOfTheirUser) {
  LinuxHost::RecordWorld("a", "enforcing");
  EXPECT_TRUE(Files().front().starts_with(worlds + "/" + std::to_string(geteuid()) + "."));
}

TEST_F(WorldRecords, MayBeBelowADirectoryOfAnyName) {
  const std::string other = directory.Path() + "/of_mine";
  const LinuxHost::UsedState used(other + "/host.db");
  fs::create_directory(other);
  LinuxHost::MakeWorldRecords();
  LinuxHost::RecordWorld("a", "enforcing");
  EXPECT_EQ(Texts(), std::vector<std::string>{std::to_string(getpid()) + " a enforcing"});
}

TEST_F(WorldRecords, GoWithTheirProcess) {
  EXPECT_EQ(RunInChild([] { LinuxHost::RecordWorld("a", "enforcing"); }), "");
  EXPECT_EQ(Texts(), std::vector<std::string>{});
  EXPECT_EQ(Files().size(), 1U);
  LinuxHost::RecordWorld("b", "enforcing");
  EXPECT_EQ(Files().size(), 1U);
}

TEST_F(WorldRecords, NeedADirectoryForThem) {
  fs::remove(worlds);
  EXPECT_EQ(MessageOf([] { LinuxHost::RecordWorld("a", "enforcing"); }),
            "Unable to record the domain in " + worlds + ": No such file or directory");
  EXPECT_EQ(Texts(), std::vector<std::string>{});
}

class RecordsOfUsers : public WorldRecords {
 protected:
  void SetUp() override {
    if (geteuid() != 0) GTEST_SKIP() << "only root can be several users";
    WorldRecords::SetUp();
    fs::permissions(directory.Path(), fs::perms(0711));
  }

  ChildProcess users{[] {
    if (setresgid(kUser, kUser, kUser) == 0 && setresuid(kUser, kUser, kUser) == 0) pause();
  }};

  // Waits until it is the user's.
  void AwaitUser() const {
    while (LinuxHost::OwnerOf(users.Id()) != kUser) usleep(1000);
  }
};

TEST_F(RecordsOfUsers, AreOfTheirOwnProcesses) {
  AwaitUser();
  Write(std::to_string(users.Id()), Content(users.Id()));
  Write(std::to_string(getpid()), Content(getpid()));
  EXPECT_EQ(Texts(), std::vector<std::string>{std::to_string(users.Id()) + " a enforcing"});
}

TEST_F(RecordsOfUsers, AreNotOfAProcessThatIsPartlyAnothers) {
  const ChildProcess mixed([] {
    if (setresuid(kUser, 0, kUser) == 0) pause();
  });
  while (LinuxHost::OwnerOf(mixed.Id()) == 0U) usleep(1000);
  Write(std::to_string(mixed.Id()), Content(mixed.Id()));
  EXPECT_EQ(Texts(), std::vector<std::string>{});
}

TEST_F(RecordsOfUsers, AreNotOfALaterProcessWithTheNumber) {
  AwaitUser();
  const std::string name = std::to_string(users.Id());
  Write(name, std::to_string(LinuxHost::StartOf(users.Id()) - 1) + " enforcing a");
  EXPECT_EQ(Texts(), std::vector<std::string>{});
  Write(name, Content(users.Id()));
  EXPECT_EQ(Texts(), std::vector<std::string>{name + " a enforcing"});
}

TEST_F(RecordsOfUsers, AreFilesOfTheOwnerOfTheDirectory) {
  AwaitUser();
  const std::string name = std::to_string(users.Id());
  Write(name, Content(users.Id()));
  const std::string file = Files().at(0);
  ASSERT_EQ(chown(file.c_str(), 8, 8), 0);
  EXPECT_EQ(Texts(), std::vector<std::string>{});
  ASSERT_EQ(chown(file.c_str(), kUser, kUser), 0);
  EXPECT_EQ(Texts().size(), 1U);
  fs::rename(file, worlds + "/aside");
  fs::create_symlink(worlds + "/aside", file);
  EXPECT_EQ(Texts(), std::vector<std::string>{});
}

TEST_F(RecordsOfUsers, AreNotReadWhereTheyAreNone) {
  AwaitUser();
  const std::string name = std::to_string(users.Id());
  const std::string start = std::to_string(LinuxHost::StartOf(users.Id()));
  const std::vector<std::string> contents = {
      "", start, start + " enforcing", " enforcing a", "0 enforcing a", "x enforcing a"};
  for (const std::string& content : contents) {
    Write(name, content);
    EXPECT_EQ(Texts(), std::vector<std::string>{}) << content;
  }
  fs::remove(worlds + "/7.abcdef/" + name);
  for (const std::string& other : {"0" + name, name + " ", "+" + name, std::string("-1")}) {
    Write(other, Content(users.Id()));
  }
  EXPECT_EQ(Texts(), std::vector<std::string>{});
}

TEST_F(RecordsOfUsers, AreMadeThoughSomebodyTookTheName) {
  fs::create_directory(worlds + "/7.abcdef");
  ASSERT_EQ(chown((worlds + "/7.abcdef").c_str(), 8, 8), 0);
  EXPECT_EQ(RunInChild([] {
              ASSERT_EQ(setresuid(kUser, kUser, kUser), 0);
              LinuxHost::RecordWorld("a", "enforcing");
              EXPECT_EQ(LinuxHost::ReadWorldRecords().size(), 1U);
            }),
            "");
  EXPECT_EQ(Files().size(), 1U);
}

class RecordsBesideTheState : public RecordsOfUsers {
 protected:
  HostState& state = HostState::Current();
  const unsigned int domain = state.Domains().Create("a", TESKACCESS_DEFAULT_DOM_NONE, false);
  const unsigned int other = state.Domains().Create("b", TESKACCESS_DEFAULT_DOM_NONE, false);
};

TEST_F(RecordsBesideTheState, TellOfProcessesThatNobodyHasPlaced) {
  AwaitUser();
  Write(std::to_string(users.Id()), Content(users.Id()));
  auto listed = LinuxHost::ListWorlds(state);
  ASSERT_EQ(listed.size(), 1U);
  EXPECT_EQ(listed[0].id, users.Id());
  EXPECT_EQ(listed[0].domainId, domain);
  EXPECT_EQ(listed[0].level, Policy::Level::kEnforcing);
  state.Worlds().Place(users.Id(), other);
  listed = LinuxHost::ListWorlds(state);
  ASSERT_EQ(listed.size(), 1U);
  EXPECT_EQ(listed[0].domainId, other);
}

TEST_F(RecordsBesideTheState, KeepNoDomain) {
  AwaitUser();
  Write(std::to_string(users.Id()), Content(users.Id()));
  state.Domains().Destroy(domain);
  const auto listed = LinuxHost::ListWorlds(state);
  ASSERT_EQ(listed.size(), 1U);
  EXPECT_EQ(state.Domains().Find(listed[0].domainId), nullptr);
}

// Where the process of `asking` is by what its parent, one of kUser's, tells of itself.
void ExpectDomainBelow(const std::function<void(pid_t)>& tell, uid_t asking,
                       unsigned int expected) {
  int told[2];
  ASSERT_EQ(pipe(told), 0);
  tell(getpid());
  ChildProcess asks([&] {
    HostState::Current().Refresh();
    char byte = 0;
    if (read(told[0], &byte, 1) != 1) throw std::runtime_error("nothing is told");
    if (setresuid(asking, asking, asking) != 0) throw std::runtime_error("who asks is root");
    const unsigned int found = LinuxHost::DomainOfCaller();
    if (found != expected) throw std::runtime_error("it is in " + std::to_string(found));
  });
  if (setresuid(kUser, kUser, kUser) != 0) throw std::runtime_error("who tells is root");
  if (write(told[1], "x", 1) != 1) throw std::runtime_error("nothing can be told");
  const std::string failure = asks.Wait();
  if (!failure.empty()) throw std::runtime_error(failure);
}

TEST_F(RecordsBesideTheState, CountForWhatTheirUserStarts) {
  const auto tell = [&](pid_t process) { Write(std::to_string(process), Content(process)); };
  EXPECT_EQ(RunInChild([&] { ExpectDomainBelow(tell, kUser, domain); }), "");
}

TEST_F(RecordsBesideTheState, CountForNothingThatIsStartedForAnother) {
  const auto tell = [&](pid_t process) { Write(std::to_string(process), Content(process)); };
  const auto expected = LinuxHost::kStartDomain;
  EXPECT_EQ(RunInChild([&] { ExpectDomainBelow(tell, kUser + 1, expected); }), "");
}

TEST_F(RecordsBesideTheState, CountForNothingThatTheSuperuserDecides) {
  LinuxHost::RecordWorld("a", "enforcing");
  EXPECT_EQ(LinuxHost::DomainOfCaller(), LinuxHost::kStartDomain);
  LinuxHost::EnterWorld(domain, Policy::Level::kEnforcing);
  EXPECT_EQ(LinuxHost::DomainOfCaller(), domain);
}

TEST_F(RecordsBesideTheState, TellNoLevelWhereTheModuleKeepsIt) {
  LinuxHost::EnterWorld(other, Policy::Level::kEnforcing);
  LinuxHost::EnterKeptWorld(domain);
  EXPECT_EQ(LinuxHost::DomainOfCaller(), domain);
  const auto listed = LinuxHost::ListWorlds(state);
  ASSERT_EQ(listed.size(), 1U);
  EXPECT_EQ(listed[0].domainId, domain);
  EXPECT_FALSE(listed[0].level);
}

}  // namespace
}  // namespace LinuxHostTest
