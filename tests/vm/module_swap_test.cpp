// Policies that are published while processes run, and publishers that are killed: hunts for a
// moment in which a refused act passes, for one in which a granted act is refused, and for a policy
// of which only a part counts and that says otherwise.

#include <fcntl.h>
#include <netinet/in.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "host/enforce/supervise/file_descriptor.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

using Enforce::FileDescriptor;

// What several processes see of each other.
struct Shared {
  std::atomic<bool> isOver = false;
  std::atomic<int> wrong = 0;
  std::atomic<int> tried = 0;
};

struct Unmap {
  void operator()(Shared* shared) const { munmap(shared, sizeof(Shared)); }
};

std::unique_ptr<Shared, Unmap> MakeShared() {
  void* const memory =
      mmap(nullptr, sizeof(Shared), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  return std::unique_ptr<Shared, Unmap>(new (memory) Shared);
}

int MakeSocket(int family) {
  const FileDescriptor made(socket(family, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  return made.IsOpen() ? 0 : errno;
}

int SendTo(int port) {
  const FileDescriptor made(socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<std::uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  return ErrorOf(sendto(made.Number(), "x", 1, 0, reinterpret_cast<const sockaddr*>(&address),
                        sizeof(address)));
}

struct Expected {
  int (*act)();
  int error;
};

// In every policy of these tests.
constexpr Expected kAlways[] = {
    {ChangeRoot, EPERM},
    {[] { return MakeSocket(AF_INET6); }, EPERM},
    {[] { return SendTo(4002); }, EPERM},
    {[] { return ErrorOf(prctl(PR_GET_TIMERSLACK, 0, 0, 0, 0)); }, EPERM},
    {[] { return MakeSocket(AF_INET); }, 0},
    {[] { return SendTo(4001); }, 0},
};

constexpr unsigned int kFirst = 20;
constexpr unsigned int kNumber = 8;

// Two policies that differ in many rules; only one of them grants sockets of AF_UNIX.
std::vector<std::string> RulesOfPolicy(bool isOdd) {
  if (!isOdd)
    return {"-p socket_family 2 grant", "-p connect_port 4001 grant", "-p prctl_option 3 grant"};
  return {"-p socket_family 1 2 grant", "-p connect_port 1000 3000 grant",
          "-p connect_port 4001 grant", "-p connect_port 5000 grant",
          "-p prctl_option 3 grant",    "-p prctl_option 39 grant",
          "-c cap_sys_admin grant"};
}

ModulePlan PlanOf(bool isOdd) {
  std::vector<Policy::InstalledDomain> domains;
  for (unsigned int id = kFirst; id < kFirst + kNumber; ++id) {
    domains.push_back(WithCalls(DomainOf(RulesOfPolicy(isOdd))));
    domains.back().id = id;
  }
  return PlanModule(domains, CAP_LAST_CAP);
}

int IsOddCounting() { return MakeSocket(AF_UNIX) == 0 ? 1 : 0; }

class ModuleSwapTest : public ModuleTest {
 protected:
  void SetUp() override {
    ModuleTest::SetUp();
    if (IsSkipped()) return;
    module->Publish(plans[0], 2);
    for (unsigned int number = 0; number < 3; ++number)
      watchers.push_back(StartWatcher(kFirst + number));
    for (unsigned int id = kFirst; id < kFirst + kNumber; ++id) {
      askers.push_back(std::make_unique<Worker>(IsOddCounting));
      module->Place(askers.back()->Process(), id);
    }
  }

  void TearDown() override {
    if (IsSkipped()) return;
    // Whoever was started later has the pipes of those before.
    while (!askers.empty()) askers.pop_back();
    shared->isOver = true;
    for (const pid_t watcher : watchers) EXPECT_EQ(ResultOf(watcher), 0);
    EXPECT_EQ(shared->wrong, 0);
    EXPECT_GT(shared->tried, 0);
  }

  // Which of the two policies counts in each of the domains.
  std::vector<int> AskAll() const {
    std::vector<int> counting;
    for (const auto& asker : askers) counting.push_back(asker->Do());
    return counting;
  }

  static std::vector<int> All(bool isOdd) { return std::vector<int>(kNumber, isOdd ? 1 : 0); }

  const ModulePlan plans[2] = {PlanOf(false), PlanOf(true)};

 private:
  // Tries all the time what is always refused and what is always granted.
  pid_t StartWatcher(unsigned int domain) {
    const pid_t child = fork();
    if (child != 0) {
      waitpid(child, nullptr, WUNTRACED);
      module->Place(child, domain);
      kill(child, SIGCONT);
      return child;
    }
    // So that there is time for the others.
    if (nice(19) < 0) _exit(1);
    raise(SIGSTOP);
    while (!shared->isOver) {
      for (const auto& [act, error] : kAlways) shared->wrong += act() == error ? 0 : 1;
      ++shared->tried;
    }
    _exit(0);
  }

  std::unique_ptr<Shared, Unmap> shared = MakeShared();
  std::vector<pid_t> watchers;
  std::vector<std::unique_ptr<Worker>> askers;
};

TEST_F(ModuleSwapTest, OpensNothingWhilePoliciesAreSwapped) {
  for (std::uint64_t number = 0; number < 200; ++number) {
    module->Publish(plans[number % 2], number);
    usleep(1000);
  }
  EXPECT_EQ(AskAll(), All(true));
}

TEST_F(ModuleSwapTest, OpensNothingWhenPublishersAreKilled) {
  constexpr std::uint64_t kTimes = 300;
  std::mt19937 chance(1);
  std::uint64_t completed = 0;
  const auto began = std::chrono::steady_clock::now();
  module->Publish(plans[0], 2);
  const auto needed = std::chrono::duration_cast<std::chrono::microseconds>(
      std::chrono::steady_clock::now() - began);
  for (std::uint64_t generation = 3; generation < 3 + kTimes; ++generation) {
    const bool isOdd = generation % 2 != 0;
    const pid_t publisher = fork();
    if (publisher == 0) {
      Module::FindRunning()->Publish(plans[isOdd ? 1 : 0], generation);
      _exit(0);
    }
    usleep(static_cast<useconds_t>(chance()) % static_cast<useconds_t>(3 * needed.count() + 1));
    kill(publisher, SIGKILL);
    ResultOf(publisher);
    if (module->Generation() == generation) {
      ++completed;
    } else {
      EXPECT_EQ(module->Generation(), generation - 1);
      module->Publish(plans[isOdd ? 1 : 0], generation);
    }
    if (generation % 8 < 2) {
      EXPECT_EQ(AskAll(), All(isOdd)) << generation;
    }
  }
  EXPECT_GT(completed, 0U);
  EXPECT_LT(completed, kTimes);
}

TEST_F(ModuleSwapTest, PublishesOnePolicyAfterTheOther) {
  const auto publish = [this](std::uint64_t which) {
    const pid_t publisher = fork();
    if (publisher != 0) return publisher;
    std::optional<Module> running = Module::FindRunning();
    for (std::uint64_t number = 0; number < 50; ++number)
      running->Publish(plans[which], 2 * number + which);
    _exit(0);
  };
  const pid_t publishers[] = {publish(0), publish(1)};
  for (const pid_t publisher : publishers) EXPECT_EQ(ResultOf(publisher), 0);
  EXPECT_EQ(AskAll(), All(module->Generation() % 2 != 0));
}

TEST_F(ModuleSwapTest, WaitsForWhoeverPublishes) {
  FileDescriptor pins(open(Enforce::kModulePins, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  ASSERT_EQ(flock(pins.Number(), LOCK_EX), 0);
  const pid_t publisher = fork();
  if (publisher == 0) {
    pins = FileDescriptor();
    Module::FindRunning()->Publish(plans[1], 3);
    _exit(0);
  }
  usleep(300000);
  EXPECT_EQ(waitpid(publisher, nullptr, WNOHANG), 0);
  EXPECT_EQ(module->Generation(), 2U);
  pins = FileDescriptor();
  EXPECT_EQ(ResultOf(publisher), 0);
  EXPECT_EQ(module->Generation(), 3U);
  EXPECT_EQ(AskAll(), All(true));
}

}  // namespace
}  // namespace EnforceTest
