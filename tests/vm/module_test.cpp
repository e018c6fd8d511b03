// The module on the kernel of a whole machine: hunts for a way that a process has out of its
// domain, for a moment in which a refused act passes, and for a refusal outside of domains.

#include <fcntl.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <linux/bpf.h>
#include <linux/capability.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "policy/decision.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

// To start it takes long, so it runs until all tests have.
class RunningModule : public testing::Environment {
  void TearDown() override {
    if (Module::FindRunning()) Module::Stop();
  }
};

const auto* const runningModule = testing::AddGlobalTestEnvironment(new RunningModule);

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

TEST_F(ModuleTest, KeepsTheGeneration) {
  EXPECT_EQ(module->Generation(), 1U);
  module->Publish(Granting(0), 0x100000002);
  EXPECT_EQ(Module::FindRunning()->Generation(), 0x100000002U);
}

// ---- Checks

int Socket(int family, int type) {
  const int made = socket(family, type | SOCK_CLOEXEC, 0);
  const int error = ErrorOf(made);
  close(made);
  return error;
}

// By the numbers of a program for 32 bits.
int IoctlOfOtherArchitecture(int descriptor, int request) {
  int result = 54;
  asm volatile("int $0x80" : "+a"(result) : "b"(descriptor), "c"(request), "d"(0) : "memory");
  return result < 0 ? -result : 0;
}

TEST_F(ModuleTest, ChecksTheIoctlsOfOtherArchitectures) {
  const ModulePlan granting =
      PlanModule({Numbered({"-p ioctl_request 0x5451 grant"})}, CAP_LAST_CAP);
  module->Publish(granting, 2);
  EXPECT_EQ(In(kDomain, [] { return IoctlOfOtherArchitecture(0, FIOCLEX); }), 0);
  EXPECT_EQ(In(kDomain, [] { return IoctlOfOtherArchitecture(0, FIONCLEX); }), EPERM);
  EXPECT_EQ(InChild([] { return IoctlOfOtherArchitecture(0, FIONCLEX); }), 0);
}

// ---- What the decision says, held against the kernel

struct Try {
  std::vector<Policy::Question> questions;  // all of which have to be answered by yes
  Act act;
};

Policy::Question Passes(const std::string& check, int value) {
  return Policy::ParameterQuestion{check, std::to_string(value)};
}

Policy::Question Uses(const std::string& capability) {
  return Policy::WordsQuestion{Policy::RuleKind::kCapability, {capability}};
}

std::vector<Try> AllTries() {
  std::vector<Try> tries;
  for (const auto& [family, type] :
       {std::pair{1, 1}, {1, 2}, {1, 5}, {2, 1}, {2, 2}, {10, 1}, {10, 2}, {16, 2}, {16, 3}}) {
    tries.push_back({{Passes("socket_family", family), Passes("socket_type", type)},
                     [family = family, type = type] { return Socket(family, type); }});
  }
  for (const int option :
       {PR_GET_DUMPABLE, PR_GET_SECUREBITS, PR_GET_TIMERSLACK, PR_GET_NO_NEW_PRIVS}) {
    tries.push_back({{Passes("prctl_option", option)},
                     [option] { return ErrorOf(prctl(option, 0, 0, 0, 0)); }});
  }
  for (const int request : {FIOCLEX, FIONCLEX, FIONREAD}) {
    tries.push_back({{Passes("ioctl_request", request)}, [request] {
                       int value = 0;
                       int ends[2];
                       if (pipe(ends) != 0) return 99;
                       const int error =
                           ErrorOf(ioctl(ends[0], static_cast<unsigned long>(request), &value));
                       close(ends[0]);
                       close(ends[1]);
                       return error;
                     }});
  }
  tries.push_back({{Uses("cap_sys_chroot")}, ChangeRoot});
  tries.push_back({{Uses("cap_sys_admin")}, [] { return ErrorOf(sethostname("host", 4)); }});
  tries.push_back({{Uses("cap_setgid")}, [] { return ErrorOf(setgroups(0, nullptr)); }});
  return tries;
}

std::string SomeRule(std::mt19937& chance) {
  const auto one = [&chance](const std::vector<std::string>& words) {
    return words[chance() % words.size()];
  };
  const std::string end = one({" grant", " grant", " revoke"});
  switch (chance() % 5) {
    case 0:
      return "-p socket_family " + one({"1", "2", "10", "16", "1 2", "2 16", "0 4294967295"}) + end;
    case 1:
      return "-p socket_type " + one({"1", "2", "3", "5", "1 2", "2 5", "1 5"}) + end;
    case 2:
      return "-p prctl_option " + one({"3", "27", "30", "39", "3 30", "28 38"}) + end;
    case 3:
      return "-p ioctl_request " +
             one({"0x5450", "0x5451", "0x541b", "0x5450 0x5451", "0 0x5450"}) + end;
    default:
      return "-c " + one({"cap_sys_chroot", "cap_sys_admin", "cap_setgid"}) + end;
  }
}

Policy::InstalledDomain SomeDomain(unsigned int id) {
  std::mt19937 chance(id);
  std::vector<std::string> rules(chance() % 9);
  for (std::string& rule : rules) rule = SomeRule(chance);
  Policy::InstalledDomain domain = DomainOf(rules);
  domain.id = id;
  domain.level = chance() % 5 == 0 ? Level::kPermissive : Level::kEnforcing;
  return WithCalls(std::move(domain));
}

bool IsAllowed(const Try& one, const Policy::InstalledDomain& domain) {
  return std::ranges::all_of(one.questions, [&domain](const Policy::Question& question) {
    return Decide(question, domain).IsAllowed();
  });
}

TEST_F(ModuleTest, RefusesWhatTheDecisionRefuses) {
  constexpr unsigned int kNumber = 60;
  std::vector<Policy::InstalledDomain> domains;
  for (unsigned int id = 0; id < kNumber; ++id) domains.push_back(SomeDomain(id));
  module->Publish(PlanModule(domains, CAP_LAST_CAP), 2);
  const std::vector<Try> tries = AllTries();
  int allowed = 0;
  int refused = 0;
  for (const Policy::InstalledDomain& domain : domains) {
    std::size_t next = 0;
    const Worker worker([&tries, &next] { return tries[next++].act(); });
    module->Place(worker.Process(), domain.id);
    for (std::size_t number = 0; number < tries.size(); ++number) {
      const bool isAllowed = IsAllowed(tries[number], domain);
      EXPECT_EQ(worker.Do(), isAllowed ? 0 : EPERM) << "domain " << domain.id << ", try " << number;
      ++(isAllowed ? allowed : refused);
    }
  }
  EXPECT_GT(allowed, 200);
  EXPECT_GT(refused, 200);
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
              Module::Start().Publish(Granting(0), 7);
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

// What a machine that is locked down to a certain degree does; tests/vm/all locks it down.
bool IsLockedDown(const std::string& degree) {
  std::ifstream file("/sys/kernel/security/lockdown");
  const std::string modes{std::istreambuf_iterator<char>(file), {}};
  return modes.find("[" + degree + "]") != std::string::npos;
}

TEST_F(ModuleTest, RefusesBelowAKernelThatIsLockedDownForIntegrity) {
  if (!IsLockedDown("integrity")) GTEST_SKIP() << "this kernel is not";
  Restart();
  module->Publish(Granting(0), 2);
  ExpectRefused(ChangeRoot);
}

TEST(ModuleBelowConfidentiality, IsNotStarted) {
  if (!IsLockedDown("confidentiality")) GTEST_SKIP() << "this kernel is not";
  EXPECT_EQ(MessageOf([] { Module::Start(); }),
            "the module: the kernel takes no such programs, since it is locked down "
            "(lockdown=confidentiality)");
  EXPECT_FALSE(Module::FindRunning().has_value());
}

// What the kernel was told is replaced for one process alone.
TEST_F(ModuleTest, IsNotStartedWhereItIsTurnedOff) {
  Module::Stop();
  const auto messageWith = [](const char* told) {
    return InChild([told] {
      if (unshare(CLONE_NEWNS) != 0) return 99;
      if (mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) return 98;
      std::ofstream("/tmp/cmdline") << told;
      if (mount("/tmp/cmdline", "/proc/cmdline", nullptr, MS_BIND, nullptr) != 0) return 97;
      const std::string message = MessageOf([] { Module::Start(); });
      if (message == "nothing was thrown") return 0;
      return message ==
                     "the module: it is turned off by secpolicy.module=off of the kernel's "
                     "command line"
                 ? 1
                 : 96;
    });
  };
  EXPECT_EQ(messageWith("quiet secpolicy.module=off rw\n"), 1);
  EXPECT_FALSE(Module::FindRunning().has_value());
  EXPECT_EQ(messageWith("quiet secpolicy.module=on secpolicy.module=offline rw\n"), 0);
  EXPECT_TRUE(Module::FindRunning().has_value());
}

}  // namespace
}  // namespace EnforceTest
