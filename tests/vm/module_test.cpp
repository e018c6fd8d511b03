// The module on the kernel of a whole machine: hunts for a way that a process has out of its
// domain, for a moment in which a refused act passes, and for a refusal outside of domains.

#include "host/enforce/module/module.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/bpf.h>
#include <linux/capability.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/ptrace.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>
#include <thread>

#include "braxo/lib/exception.h"

namespace EnforceTest {
namespace {

using Enforce::Module;
using Enforce::ModulePlan;
using Policy::Level;

constexpr unsigned int kDomain = 5;
constexpr unsigned int kOther = 6;
constexpr std::uint64_t kChroot = std::uint64_t{1} << CAP_SYS_CHROOT;
constexpr std::uint64_t kAll = ~std::uint64_t{0};

// 0 or the error number of an act.
using Act = std::function<int()>;

int ErrorOf(long result) { return result < 0 ? errno : 0; }

int ChangeRoot() { return ErrorOf(chroot("/")); }

int ResultOf(pid_t child) {
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : 1000 + WTERMSIG(status);
}

int InChild(const Act& act) {
  const pid_t child = fork();
  if (child == 0) _exit(act());
  return ResultOf(child);
}

// A process that does something when it is told, any number of times.
class Worker {
 public:
  explicit Worker(const Act& act) {
    EXPECT_EQ(pipe(orders), 0);
    EXPECT_EQ(pipe(results), 0);
    process = fork();
    if (process == 0) Serve(act);
    close(orders[0]);
    close(results[1]);
  }
  ~Worker() {
    close(orders[1]);
    close(results[0]);
    ResultOf(process);
  }
  Worker(const Worker&) = delete;
  Worker& operator=(const Worker&) = delete;

  pid_t Process() const { return process; }

  int Do() const {
    int result = -1;
    EXPECT_EQ(write(orders[1], "", 1), 1);
    EXPECT_EQ(read(results[0], &result, sizeof(result)), static_cast<ssize_t>(sizeof(result)));
    return result;
  }

 private:
  [[noreturn]] void Serve(const Act& act) const {
    close(orders[1]);
    char order = 0;
    while (read(orders[0], &order, 1) == 1) {
      const int result = act();
      if (write(results[1], &result, sizeof(result)) != sizeof(result)) break;
    }
    _exit(0);
  }

  int orders[2] = {};
  int results[2] = {};
  pid_t process = -1;
};

std::string MessageOf(const std::function<void()>& act) {
  try {
    act();
  } catch (const Braxo::Lib::BraxoException& exception) {
    return exception.what();
  }
  return "nothing was thrown";
}

bool KernelRunsPrograms() {
  std::ifstream file("/sys/kernel/security/lsm");
  const std::string modules{std::istreambuf_iterator<char>(file), {}};
  return ("," + modules + ",").find(",bpf,") != std::string::npos;
}

class ModuleTest : public testing::Test {
 protected:
  void SetUp() override {
    if (!KernelRunsPrograms()) GTEST_SKIP() << "bpf is not among this kernel's security modules";
    module = Module::FindRunning();
    if (!module) module = Module::Start();
    module->Publish(Granting(kChroot), 1);
  }
  static void TearDownTestSuite() { Module::Stop(); }

  // To load it takes most of the time, so it is done by tests of what it takes with it.
  void Restart() {
    Module::Stop();
    module = Module::Start();
  }

  // kDomain may use these capabilities and kOther all.
  static ModulePlan Granting(std::uint64_t capabilities, Level level = Level::kEnforcing) {
    return {{kDomain, level, {capabilities}}, {kOther, Level::kEnforcing, {kAll}}};
  }

  // What comes of an act in a domain.
  int In(unsigned int domain, const Act& act) {
    const Worker worker(act);
    module->Place(worker.Process(), domain);
    return worker.Do();
  }

  // The domain refuses it, and outside it works.
  void ExpectRefused(const Act& act) {
    EXPECT_EQ(In(kDomain, act), EPERM);
    EXPECT_EQ(InChild(act), 0);
  }

  std::optional<Module> module;
};

// ---- Capabilities and levels

TEST_F(ModuleTest, RefusesACapabilityThatIsNotGranted) {
  EXPECT_EQ(In(kDomain, ChangeRoot), 0);
  module->Publish(Granting(kAll & ~kChroot), 2);
  ExpectRefused(ChangeRoot);
}

TEST_F(ModuleTest, RefusesAllInADomainThatThereIsNot) {
  EXPECT_EQ(In(kOther + 1, ChangeRoot), EPERM);
  module->Publish({}, 2);
  ExpectRefused(ChangeRoot);
}

TEST_F(ModuleTest, OnlyCountsInAPermissiveDomain) {
  Restart();
  module->Publish(Granting(0, Level::kPermissive), 2);
  EXPECT_EQ(In(kDomain, ChangeRoot), 0);
  EXPECT_EQ(module->RefusalsIn(kDomain).passed, 1U);
  EXPECT_EQ(module->RefusalsIn(kDomain).refused, 0U);
}

TEST_F(ModuleTest, CountsWhatItRefuses) {
  Restart();
  module->Publish(Granting(0), 2);
  EXPECT_EQ(In(kDomain, ChangeRoot), EPERM);
  EXPECT_EQ(module->RefusalsIn(kDomain).refused, 1U);
  EXPECT_EQ(module->RefusalsIn(kDomain).passed, 0U);
  EXPECT_EQ(module->RefusalsIn(kOther).refused, 0U);
}

TEST_F(ModuleTest, ObeysALevelAtOnce) {
  module->Publish(Granting(0), 2);
  const Worker worker(ChangeRoot);
  module->Place(worker.Process(), kDomain);
  for (int turn = 0; turn < 3; ++turn) {
    EXPECT_EQ(worker.Do(), EPERM);
    module->SetLevel(kDomain, Level::kPermissive);
    EXPECT_EQ(worker.Do(), 0);
    module->SetLevel(kDomain, Level::kEnforcing);
    EXPECT_EQ(worker.Do(), EPERM);
    module->SetLevel(kDomain, Level::kDisabled);
    EXPECT_EQ(worker.Do(), 0);
    module->SetLevel(kDomain, Level::kEnforcing);
  }
}

TEST_F(ModuleTest, OpensNothingWhilePoliciesAreSwapped) {
  module->Publish(Granting(0), 2);
  const auto tries = [] {
    for (int number = 0; number < 20000; ++number) {
      if (ChangeRoot() != EPERM) return 0;
    }
    return EPERM;
  };
  const pid_t child = fork();
  if (child == 0) {
    raise(SIGSTOP);
    _exit(tries());
  }
  waitpid(child, nullptr, WUNTRACED);
  module->Place(child, kDomain);
  kill(child, SIGCONT);
  for (std::uint64_t number = 0; number < 200; ++number)
    module->Publish(Granting(number % 2 == 0 ? kAll & ~kChroot : 0), number);
  EXPECT_EQ(ResultOf(child), EPERM);
}

TEST_F(ModuleTest, KeepsTheGeneration) {
  EXPECT_EQ(module->Generation(), 1U);
  module->Publish(Granting(0), 0x100000002);
  EXPECT_EQ(Module::FindRunning()->Generation(), 0x100000002U);
}

// ---- Who is in a domain

TEST_F(ModuleTest, TellsWhoIsInADomain) {
  const Worker worker(ChangeRoot);
  EXPECT_EQ(module->DomainOf(worker.Process()), std::nullopt);
  module->Place(worker.Process(), kDomain);
  EXPECT_EQ(module->DomainOf(worker.Process()), kDomain);
  module->Place(worker.Process(), kOther);
  EXPECT_EQ(module->DomainOf(worker.Process()), kOther);
  EXPECT_EQ(module->DomainOf(getpid()), std::nullopt);
}

TEST_F(ModuleTest, KeepsChildrenInTheDomain) {
  module->Publish(Granting(0), 2);
  ExpectRefused([] { return InChild([] { return InChild(ChangeRoot); }); });
}

TEST_F(ModuleTest, KeepsWhoIsExecutedInTheDomain) {
  module->Publish(Granting(0), 2);
  const auto execute = [] {
    return InChild([] {
      execl("/bin/busybox", "busybox", "sh", "-c", "busybox chroot / /bin/true", nullptr);
      return errno;
    });
  };
  EXPECT_EQ(In(kDomain, execute), 1);
  EXPECT_EQ(InChild(execute), 0);
}

// The first thread ends then, and the one that executes takes its place.
TEST_F(ModuleTest, KeepsWhoIsExecutedByAnotherThreadInTheDomain) {
  module->Publish(Granting(0), 2);
  const auto execute = [] {
    return InChild([] {
      std::thread([] {
        execl("/bin/busybox", "busybox", "chroot", "/", "/bin/true", nullptr);
      }).join();
      return 99;
    });
  };
  EXPECT_EQ(In(kDomain, execute), 1);
  EXPECT_EQ(InChild(execute), 0);
}

TEST_F(ModuleTest, CountsForAllThreads) {
  module->Publish(Granting(0), 2);
  ExpectRefused([] {
    int result = -1;
    std::thread([&result] { result = ChangeRoot(); }).join();
    return result;
  });
}

TEST_F(ModuleTest, CountsInAUserNamespaceOfOnesOwn) {
  module->Publish(Granting(0), 2);
  ExpectRefused(
      [] { return InChild([] { return unshare(CLONE_NEWUSER) == 0 ? ChangeRoot() : 99; }); });
}

// ---- What would undo it

TEST_F(ModuleTest, KeepsMapsFromDomains) {
  module->Publish(Granting(kAll), 2);
  ExpectRefused([] {
    const std::string path = std::string(Enforce::kModulePins) + "/tasks";
    bpf_attr attributes = {};
    attributes.pathname = reinterpret_cast<std::uintptr_t>(path.c_str());
    return ErrorOf(syscall(SYS_bpf, BPF_OBJ_GET, &attributes, sizeof(attributes)));
  });
}

TEST_F(ModuleTest, KeepsItsProgramsFromDomains) {
  module->Publish(Granting(kAll), 2);
  const std::string link = std::string(Enforce::kModulePins) + "/link_use_capability";
  ASSERT_TRUE(std::filesystem::exists(link));
  EXPECT_EQ(In(kDomain, [&link] { return ErrorOf(unlink(link.c_str())); }), EPERM);
  EXPECT_EQ(In(kDomain, [&link] { return ErrorOf(rename(link.c_str(), "/sys/fs/bpf/elsewhere")); }),
            EPERM);
  EXPECT_TRUE(std::filesystem::exists(link));
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(umount2("/sys/fs/bpf", MNT_DETACH)); }), EPERM);
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(umount2("/sys", MNT_DETACH)); }), EPERM);
  EXPECT_EQ(InChild([&link] { return ErrorOf(unlink(link.c_str())); }), 0);
  Module::Stop();
}

TEST_F(ModuleTest, KeepsOtherProcessesFromDomains) {
  module->Publish(Granting(kAll), 2);
  const Worker victim(ChangeRoot);
  const auto trace = [&victim] { return ErrorOf(ptrace(PTRACE_SEIZE, victim.Process(), 0, 0)); };
  EXPECT_EQ(In(kDomain, trace), EPERM);
  module->Place(victim.Process(), kOther);
  EXPECT_EQ(In(kDomain, trace), EPERM);
  EXPECT_EQ(In(kOther, trace), 0);
}

// ---- Its life

TEST_F(ModuleTest, RefusesNothingOnceItIsStopped) {
  module->Publish(Granting(0), 2);
  const Worker worker(ChangeRoot);
  module->Place(worker.Process(), kDomain);
  EXPECT_EQ(worker.Do(), EPERM);
  module.reset();
  Module::Stop();
  EXPECT_EQ(Module::FindRunning().has_value(), false);
  EXPECT_EQ(worker.Do(), 0);
}

TEST_F(ModuleTest, IsStartedOnce) {
  EXPECT_EQ(MessageOf([] { Module::Start(); }), "the module: it runs already");
}

TEST_F(ModuleTest, NeedsNobodyToLive) {
  module.reset();
  Module::Stop();
  EXPECT_EQ(InChild([] {
              Module::Start().Publish({{kDomain, Level::kEnforcing, {0}}}, 7);
              raise(SIGKILL);
              return 0;
            }),
            1000 + SIGKILL);
  module = Module::FindRunning();
  ASSERT_TRUE(module.has_value());
  EXPECT_EQ(module->Generation(), 7U);
  ExpectRefused(ChangeRoot);
}

TEST_F(ModuleTest, LeavesNothingWhereItCannotBeSeenToRefuse) {
  module.reset();
  Module::Stop();
  EXPECT_EQ(InChild([] {
              const std::string told = MessageOf([] {
                __user_cap_header_struct own = {_LINUX_CAPABILITY_VERSION_3, 0};
                __user_cap_data_struct sets[2] = {};
                syscall(SYS_capget, &own, sets);
                sets[0].effective &= ~(1U << CAP_SETPCAP);
                syscall(SYS_capset, &own, sets);
                Module::Start();
              });
              return told == "the module: whoever starts it needs the capability cap_setpcap" ? 0
                                                                                              : 1;
            }),
            0);
  EXPECT_FALSE(std::filesystem::exists(Enforce::kModulePins));
}

TEST_F(ModuleTest, RefusesNumbersBeyondItsDomains) {
  EXPECT_EQ(MessageOf([this] { module->Place(getpid(), Enforce::kModuleDomains); }),
            "the module: there is no domain 512");
  EXPECT_EQ(MessageOf([this] { module->SetLevel(Enforce::kModuleDomains, Level::kDisabled); }),
            "the module: there is no domain 512");
}

// For a kernel that was started without bpf among its security modules: programs load there, too.
TEST(ModuleWithoutSecurityModule, IsNotStarted) {
  if (KernelRunsPrograms()) GTEST_SKIP() << "this kernel runs programs";
  EXPECT_EQ(MessageOf([] { Module::Start(); }),
            "the module: the kernel does not run its programs, since bpf is not among the security "
            "modules that it was started with (lsm=)");
  EXPECT_FALSE(std::filesystem::exists(Enforce::kModulePins));
}

}  // namespace
}  // namespace EnforceTest
