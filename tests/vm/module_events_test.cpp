// What the module tells of what it refuses: hunts for a refusal that is told otherwise than it was,
// or not at all.

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <string>
#include <vector>

#include "host/enforce/module/event_reader.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

using Enforce::ModuleEvent;
using namespace std::chrono_literals;

struct Told {
  ModuleEvent event;
  std::string path;
};

class ModuleEventsTest : public ModuleTest {
 protected:
  // What is told of an act in the domain.
  std::vector<Told> ToldOf(const Act& act, int expected = EPERM) {
    const Worker worker(act);
    process = worker.Process();
    module->Place(process, kDomain);
    told.clear();
    Enforce::EventReader reader(
        [this](const ModuleEvent& event, std::string_view path) { Take(event, path); });
    reader.Drain();
    told.clear();
    EXPECT_EQ(worker.Do(), expected);
    reader.Drain();
    return told;
  }

  void Take(const ModuleEvent& event, std::string_view path) {
    if (event.domain == kDomain) told.push_back({event, std::string(path)});
  }

  // kDomain, with these rules.
  void Publish(const std::vector<std::string>& rules, Level level = Level::kEnforcing) {
    Policy::InstalledDomain domain = Numbered(rules);
    domain.level = level;
    module->Publish(PlanModule({domain}, CAP_LAST_CAP), 2);
  }

  std::vector<Told> told;
  pid_t process = 0;
};

TEST_F(ModuleEventsTest, TellsWhoWasRefusedWhat) {
  Publish({});
  const std::vector<Told> all = ToldOf(ChangeRoot);
  ASSERT_EQ(all.size(), 1U);
  const ModuleEvent& event = all[0].event;
  EXPECT_EQ(event.act, static_cast<__u32>(Enforce::kActUseCapability));
  EXPECT_EQ(event.value, static_cast<__u64>(CAP_SYS_CHROOT));
  EXPECT_EQ(event.process, static_cast<__u32>(process));
  EXPECT_EQ(event.parent, static_cast<__u32>(getpid()));
  EXPECT_EQ(event.user, 0U);
  EXPECT_EQ(event.isRefused, 1U);
  EXPECT_EQ(event.label, static_cast<__u32>(Enforce::kNoModuleLabel));
  EXPECT_STREQ(event.program, "module_tests");
  EXPECT_EQ(all[0].path, "");
  timespec now = {};
  clock_gettime(CLOCK_BOOTTIME, &now);
  EXPECT_LE(event.started, event.time);
  EXPECT_LE(event.time / 1'000'000'000, static_cast<__u64>(now.tv_sec));
  EXPECT_GE(event.time / 1'000'000'000 + 60, static_cast<__u64>(now.tv_sec));
}

TEST_F(ModuleEventsTest, TellsWhatPassesInAPermissiveDomain) {
  Publish({}, Level::kPermissive);
  const std::vector<Told> all = ToldOf(ChangeRoot, 0);
  ASSERT_EQ(all.size(), 1U);
  EXPECT_EQ(all[0].event.isRefused, 0U);
}

TEST_F(ModuleEventsTest, TellsNothingOfWhatIsGranted) {
  Publish({"-c cap_sys_chroot grant"});
  EXPECT_TRUE(ToldOf(ChangeRoot, 0).empty());
  Publish({}, Level::kDisabled);
  EXPECT_TRUE(ToldOf(ChangeRoot, 0).empty());
}

TEST_F(ModuleEventsTest, TellsTheValueThatDidNotPass) {
  Publish({"-p socket_family 1 grant"});
  const std::vector<Told> all = ToldOf([] { return ErrorOf(socket(AF_INET, SOCK_STREAM, 0)); });
  ASSERT_EQ(all.size(), 1U);
  EXPECT_EQ(all[0].event.act, static_cast<__u32>(Enforce::kActPassValue));
  EXPECT_EQ(all[0].event.detail, static_cast<__u32>(Enforce::kCheckFamily));
  EXPECT_EQ(all[0].event.value, static_cast<__u64>(AF_INET));
}

TEST_F(ModuleEventsTest, TellsWhatIsNoRules) {
  Publish({});
  const std::vector<Told> all =
      ToldOf([] { return ErrorOf(unlink("/sys/fs/bpf/secpolicy/events")); });
  ASSERT_FALSE(all.empty());
  EXPECT_EQ(all[0].event.act, static_cast<__u32>(Enforce::kActReachModule));
}

int Ask(const std::string& path) {
  const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (file < 0) return 1000 + errno;
  int value = 0;
  return ErrorOf(ioctl(file, FIONREAD, &value));
}

TEST_F(ModuleEventsTest, TellsShortAndLongPaths) {
  Publish({"-p ioctl_request 1 grant"});
  std::vector<Told> all = ToldOf([] { return Ask("/etc/passwd"); });
  ASSERT_EQ(all.size(), 1U);
  EXPECT_EQ(all[0].path, "/etc/passwd");
  std::string directory = "/tmp/module-events";
  for (int depth = 0; depth < 14; ++depth) directory += "/" + std::string(250, 'd');
  std::filesystem::create_directories(directory);
  std::ofstream(directory + "/file") << "text";
  const auto same = [&directory] { return Ask(directory + "/file"); };
  all = ToldOf(same);
  ASSERT_EQ(all.size(), 1U);
  EXPECT_EQ(all[0].path, directory + "/file");
  std::filesystem::remove_all("/tmp/module-events");
}

TEST_F(ModuleEventsTest, CountsWhatThereIsNoRoomFor) {
  Restart();
  Publish({});
  constexpr int kMany = 20'000;
  const std::vector<Told> all = ToldOf([] {
    for (int number = 0; number < kMany; ++number) {
      if (ChangeRoot() != EPERM) return 0;
    }
    return EPERM;
  });
  const Enforce::ModuleRefusals counts = module->RefusalsIn(kDomain);
  EXPECT_EQ(counts.refused, static_cast<__u64>(kMany));
  EXPECT_GT(counts.untold, 0U);
  EXPECT_EQ(all.size() + counts.untold, static_cast<std::size_t>(kMany));
  const Enforce::EventReader reader([](const ModuleEvent&, std::string_view) {});
  EXPECT_EQ(reader.UntoldIn(kDomain), counts.untold);
  EXPECT_TRUE(reader.IsOfRunningModule());
  Restart();
  EXPECT_FALSE(reader.IsOfRunningModule());
}

}  // namespace
}  // namespace EnforceTest
