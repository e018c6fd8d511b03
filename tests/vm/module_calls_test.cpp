// Rules about system calls on the kernel of a whole machine: hunts for a call that passes without
// its rule where it is said to be refused, and for one that a rule does not let pass.

#include "host/enforce/module/module_calls.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/perf_event.h>
#include <linux/sched.h>
#include <linux/sockios.h>
#include <sched.h>
#include <sys/inotify.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <filesystem>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "policy/decision.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

using testing::AnyOf;

using Arguments = std::vector<long>;

long PathAt(const char* path) { return reinterpret_cast<long>(path); }

// What each call is tried with. Nothing of it changes the machine: what would is given what there
// is not.
std::map<std::string, Arguments> Attempts() {
  static int number = 0;
  static long ends[2];
  static const timespec times[2] = {{0, UTIME_NOW}, {0, UTIME_NOW}};
  const long file = open("/tmp/tried", O_CREAT | O_RDWR | O_CLOEXEC, 0600);
  const long self = getpid();
  const long path = PathAt("/tmp/tried");
  const long missing = PathAt("/tmp/missing");
  const long empty = PathAt("");
  const long buffer = PathAt(reinterpret_cast<const char*>(&number));
  const long pair = reinterpret_cast<long>(&ends);
  static char status[512];
  static siginfo_t told = {};
  told.si_code = SI_QUEUE;
  const long queued = reinterpret_cast<long>(&told);
  static perf_event_attr counted = {};
  counted.type = PERF_TYPE_SOFTWARE;
  counted.size = sizeof(counted);
  counted.config = PERF_COUNT_SW_DUMMY;
  const long into = reinterpret_cast<long>(&status);
  const long now = reinterpret_cast<long>(&times);
  return {
      {"acct", {missing}},
      {"chmod", {path, 0600}},
      {"chown", {path, -1, -1}},
      {"chroot", {PathAt("/")}},
      {"delete_module", {missing, 0}},
      {"execve", {path, 0, 0}},
      {"execveat", {AT_FDCWD, path, 0, 0, 0}},
      {"fchmod", {file, 0600}},
      {"fchmodat", {AT_FDCWD, path, 0600}},
      {"fchown", {file, -1, -1}},
      {"fchownat", {AT_FDCWD, path, -1, -1, 0}},
      {"fcntl", {file, F_GETFD}},
      {"finit_module", {file, empty, 0}},
      {"fstat", {file, into}},
      {"ftruncate", {file, 0}},
      {"futimesat", {AT_FDCWD, path, 0}},
      {"init_module", {0, 0, empty}},
      {"inotify_add_watch", {inotify_init1(IN_CLOEXEC), path, IN_MODIFY}},
      {"ioctl", {file, FIONREAD, buffer}},
      {"kill", {self, 0}},
      {"lchown", {path, -1, -1}},
      {"lstat", {path, into}},
      {"newfstatat", {AT_FDCWD, path, into, 0}},
      {"prctl", {3, 0, 0, 0, 0}},
      {"reboot", {0, 0, 0, 0}},
      {"rename", {path, path}},
      {"renameat", {AT_FDCWD, path, AT_FDCWD, path}},
      {"renameat2", {AT_FDCWD, path, AT_FDCWD, path, 0}},
      {"rt_sigqueueinfo", {self, 0, queued}},
      {"rt_tgsigqueueinfo", {self, self, 0, queued}},
      {"setdomainname", {missing, 4}},
      {"setgroups", {0, 0}},
      {"sethostname", {missing, 4}},
      {"settimeofday", {0, 0}},
      {"socket", {AF_UNIX, SOCK_STREAM, 0}},
      {"socketpair", {AF_UNIX, SOCK_STREAM, 0, pair}},
      {"stat", {path, into}},
      {"statx", {AT_FDCWD, path, 0, 0, into}},
      {"swapoff", {missing}},
      {"swapon", {missing, 0}},
      {"tgkill", {self, self, 0}},
      {"tkill", {self, 0}},
      {"truncate", {path, 0}},
      {"userfaultfd", {0}},
      {"utime", {path, 0}},
      {"utimensat", {AT_FDCWD, path, now, 0}},
      {"utimes", {path, 0}},
  };
}

int Call(int number, Arguments arguments) {
  arguments.resize(6);
  return ErrorOf(syscall(number, arguments[0], arguments[1], arguments[2], arguments[3],
                         arguments[4], arguments[5]));
}

// A plan for kDomain alone.
ModulePlan Open() { return PlanModule({Numbered({})}, CAP_LAST_CAP); }

void Clear(Enforce::ModuleRules& rules, int number, int table = Enforce::kCallsOfMachine) {
  rules.calls[table][number / Enforce::kCallsInWord] &=
      ~(std::uint64_t{1} << number % Enforce::kCallsInWord);
}

int NumberOf(const std::string& call) { return Enforce::NumberOf(call).value(); }

// Each call in a domain that lacks it alone, and in one that lacks none.
TEST_F(ModuleTest, RefusesACallThatIsNotGranted) {
  const auto attempts = Attempts();
  const auto atHooks = Enforce::CallsAtHooks();
  ModulePlan plan = Open();
  for (const auto& [call, arguments] : attempts) {
    Enforce::ModuleDomain lacking = plan[0];
    lacking.id = kDomain + static_cast<unsigned int>(plan.size());
    lacking.rules.capabilities = kAll;
    Clear(lacking.rules, NumberOf(call));
    plan.push_back(lacking);
  }
  plan[0].rules.capabilities = kAll;
  module->Publish(plan, 2);
  unsigned int id = kDomain;
  for (const auto& [call, arguments] : attempts) {
    EXPECT_TRUE(std::ranges::binary_search(atHooks, call)) << call;
    const Worker worker(
        [number = NumberOf(call), &arguments = arguments] { return Call(number, arguments); });
    const int outside = worker.Do();
    EXPECT_NE(outside, EPERM) << call;
    module->Place(worker.Process(), kDomain);
    EXPECT_EQ(worker.Do(), outside) << call;
    module->Place(worker.Process(), ++id);
    // Where a capability was asked for in vain, some calls have an error of their own for it.
    EXPECT_THAT(worker.Do(), AnyOf(EPERM, EACCES)) << call;
  }
}

// Entries of directories, whose calls can be made but once.
TEST_F(ModuleTest, RefusesToMakeAndRemoveEntriesWithoutTheCalls) {
  const char* const path = "/tmp/entry";
  const std::map<int, Act> acts = {
      {SYS_mkdir, [=] { return ErrorOf(mkdir(path, 0700)); }},
      {SYS_rmdir, [=] { return ErrorOf(rmdir(path)); }},
      {SYS_symlink, [=] { return ErrorOf(symlink("/", path)); }},
      {SYS_unlink, [=] { return ErrorOf(unlink(path)); }},
      {SYS_mknod,
       [=] {
         return Call(SYS_mknod, {PathAt(path), S_IFIFO | 0600});
       }},
      {SYS_unlinkat, [=] { return ErrorOf(unlinkat(AT_FDCWD, path, 0)); }},
  };
  for (const auto& [number, act] : acts) {
    ModulePlan plan = Open();
    Clear(plan[0].rules, number);
    module->Publish(plan, 2);
    const bool isRemoval = number == SYS_rmdir || number == SYS_unlink || number == SYS_unlinkat;
    if (isRemoval) {
      ASSERT_EQ(number == SYS_rmdir ? mkdir(path, 0700) : symlink("/", path), 0);
    }
    EXPECT_EQ(In(kDomain, act), EPERM) << number;
    module->Publish(Open(), 3);
    EXPECT_EQ(In(kDomain, act), 0) << number;
    std::filesystem::remove(path);
  }
}

// What is not opened makes nothing either.
TEST_F(ModuleTest, MakesNoFileWithoutTheCall) {
  const char* const path = "/tmp/opened";
  ModulePlan plan = Open();
  Clear(plan[0].rules, SYS_openat);
  module->Publish(plan, 2);
  const Act act = [=] { return ErrorOf(openat(AT_FDCWD, path, O_CREAT | O_RDWR, 0600)); };
  EXPECT_EQ(In(kDomain, act), EPERM);
  EXPECT_FALSE(std::filesystem::exists(path));
  module->Publish(Open(), 3);
  EXPECT_EQ(In(kDomain, act), 0);
}

TEST_F(ModuleTest, RefusesNewProcessesWithoutTheirCalls) {
  const auto attempt = [](int number, long first) {
    return [number, first] {
      const long child = syscall(number, first, 0, 0, 0, 0);
      if (child == 0) _exit(0);
      return child < 0 ? errno : ResultOf(static_cast<pid_t>(child));
    };
  };
  for (const int number : {SYS_fork, SYS_clone}) {
    ModulePlan plan = Open();
    module->Publish(plan, 2);
    const Act act = attempt(number, SIGCHLD);
    EXPECT_EQ(In(kDomain, act), 0);
    Clear(plan[0].rules, number);
    module->Publish(plan, 3);
    ExpectRefused(act);
  }
}

TEST_F(ModuleTest, KnowsACallByWhatTheKernelTakesForItsNumber) {
  ModulePlan plan = Open();
  Clear(plan[0].rules, SYS_stat);
  module->Publish(plan, 2);
  const auto withBits = [](long number) {
    return [number] {
      long result = number;
      struct stat status = {};
      asm volatile("syscall" : "+a"(result) : "D"("/"), "S"(&status) : "rcx", "r11", "memory");
      return result < 0 ? static_cast<int>(-result) : 0;
    };
  };
  ExpectRefused(withBits(SYS_stat));
  ExpectRefused(withBits(SYS_stat | 0x7'0000'0000));
  EXPECT_EQ(In(kDomain, withBits(SYS_lstat | 0x7'0000'0000)), 0);
}

// stat64 has another number there, which is that of another call here.
int StatOf32Bits() {
  // Below what these registers hold.
  static char* const low = static_cast<char*>(
      mmap(nullptr, 4096, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_32BIT, -1, 0));
  low[0] = '/';
  int result = 195;
  asm volatile("int $0x80" : "+a"(result) : "b"(low), "c"(low + 256) : "memory");
  return result < 0 ? -result : 0;
}

TEST_F(ModuleTest, KnowsCallsOf32BitsByTheirOwnNumbers) {
  ASSERT_EQ(StatOf32Bits(), 0);
  ModulePlan plan = Open();
  Clear(plan[0].rules, 195);
  module->Publish(plan, 2);
  EXPECT_EQ(In(kDomain, StatOf32Bits), 0);
  Clear(plan[0].rules, 195, Enforce::kCallsOf32Bits);
  module->Publish(plan, 3);
  ExpectRefused(StatOf32Bits);
}

TEST_F(ModuleTest, RefusesCallsInNoDomainThatThereIs) {
  module->Publish({}, 2);
  ExpectRefused([] { return Call(SYS_socket, {AF_UNIX, SOCK_STREAM, 0}); });
}

TEST_F(ModuleTest, LetsCallsPassInAPermissiveDomain) {
  ModulePlan plan = Open();
  Clear(plan[0].rules, SYS_socket);
  plan[0].level = Level::kPermissive;
  module->Publish(plan, 2);
  EXPECT_EQ(In(kDomain, [] { return Call(SYS_socket, {AF_UNIX, SOCK_STREAM, 0}); }), 0);
  plan[0].level = Level::kEnforcing;
  module->Publish(plan, 3);
  EXPECT_EQ(In(kDomain, [] { return Call(SYS_socket, {AF_UNIX, SOCK_STREAM, 0}); }), EPERM);
}

// ---- Flags of new processes

TEST_F(ModuleTest, PassesFlagsAsTheDecisionDoes) {
  constexpr std::uint64_t kTried[] = {0,
                                      CLONE_FS,
                                      CLONE_FILES,
                                      CLONE_FS | CLONE_FILES,
                                      CLONE_NEWUTS,
                                      CLONE_NEWUTS | CLONE_FILES,
                                      CLONE_NEWUSER,
                                      CLONE_NEWUSER | CLONE_NEWUTS,
                                      CLONE_CLEAR_SIGHAND};
  const std::vector<std::vector<std::string>> policies = {
      {},
      {"-p clone_flags 0x400 revoke"},
      {"-p clone_flags 0x400 grant"},
      {"-p clone_flags 0x600 grant", "-p clone_flags 0x200 revoke"},
      {"-p clone_flags 0x4000200 grant", "-p clone_flags 0x400 grant"},
      {"-p clone_flags 0x10000000 revoke", "-p clone_flags 0x100000000 revoke"},
      {"-p clone_flags 0x14000000 grant"},
      {"-p clone_flags 0x11 grant"}};
  int refused = 0;
  for (const auto& rules : policies) {
    const Policy::InstalledDomain domain = Numbered(rules);
    ModulePlan plan = PlanModule({domain}, CAP_LAST_CAP);
    plan[0].rules.capabilities = kAll;
    module->Publish(plan, 2);
    for (const std::uint64_t flags : kTried) {
      const bool isAllowed =
          Decide(Policy::ParameterQuestion{"clone_flags", std::to_string(flags)}, domain)
              .IsAllowed();
      refused += !isAllowed;
      EXPECT_EQ(In(kDomain, [flags] { return Clone(flags); }), isAllowed ? 0 : EPERM)
          << flags << (rules.empty() ? "" : rules[0]);
    }
  }
  EXPECT_GT(refused, 20);
}

TEST_F(ModuleTest, ChecksTheFlagsOfUnshare) {
  ModulePlan plan = PlanModule({Numbered({"-p clone_flags 0x4000000 grant"})}, CAP_LAST_CAP);
  plan[0].rules.capabilities = kAll;
  module->Publish(plan, 2);
  const auto leave = [](int flags) { return [flags] { return ErrorOf(unshare(flags)); }; };
  EXPECT_EQ(In(kDomain, leave(CLONE_NEWUTS)), 0);
  ExpectRefused(leave(CLONE_NEWIPC));
  ExpectRefused(leave(CLONE_NEWUTS | CLONE_NEWIPC));
  ExpectRefused(leave(CLONE_NEWUSER));
}

// ---- Signals

TEST_F(ModuleTest, SendsSignalsAsTheDecisionSays) {
  const Worker target(ChangeRoot);
  const std::vector<std::vector<std::string>> policies = {
      {},
      {"-p kill_signal 0 grant", "-p kill_signal 17 28 grant", "-p kill_signal 23 revoke"},
      {"-p kill_signal 28 revoke"}};
  for (const auto& rules : policies) {
    const Policy::InstalledDomain domain = Numbered(rules);
    module->Publish(PlanModule({domain}, CAP_LAST_CAP), 2);
    for (const int signal : {0, SIGCHLD, SIGURG, SIGWINCH, SIGCONT}) {
      const bool isAllowed =
          Decide(Policy::ParameterQuestion{"kill_signal", std::to_string(signal)}, domain)
              .IsAllowed();
      const int expected = isAllowed ? 0 : EPERM;
      const pid_t process = target.Process();
      EXPECT_EQ(In(kDomain, [=] { return ErrorOf(kill(process, signal)); }), expected);
      EXPECT_EQ(In(kDomain, [=] { return ErrorOf(syscall(SYS_tgkill, process, process, signal)); }),
                expected);
    }
  }
}

// A process, as a process that owns a descriptor is told of it by a signal.
int Own(int command, long argument) {
  int ends[2];
  if (pipe(ends) != 0) return 99;
  const int error = ErrorOf(fcntl(ends[0], command, argument));
  close(ends[0]);
  close(ends[1]);
  return error;
}

int OwnByRequest() {
  int owner = getppid();
  const int made = socket(AF_UNIX, SOCK_STREAM, 0);
  const int error = ErrorOf(ioctl(made, FIOSETOWN, &owner));
  close(made);
  return error;
}

TEST_F(ModuleTest, HasDescriptorsSendNoOtherSignals) {
  const auto own = [] { return Own(F_SETOWN, getppid()); };
  const auto choose = [](long signal) { return [signal] { return Own(F_SETSIG, signal); }; };
  module->Publish(PlanModule({Numbered({"-p kill_signal 9 revoke"})}, CAP_LAST_CAP), 2);
  EXPECT_EQ(In(kDomain, own), 0);
  EXPECT_EQ(In(kDomain, OwnByRequest), 0);
  EXPECT_EQ(In(kDomain, choose(SIGUSR1)), 0);
  ExpectRefused(choose(SIGKILL));
  module->Publish(PlanModule({Numbered({"-p kill_signal 29 revoke"})}, CAP_LAST_CAP), 3);
  ExpectRefused(own);
  ExpectRefused(OwnByRequest);
  ExpectRefused(choose(0));
  EXPECT_EQ(In(kDomain, choose(SIGKILL)), 0);
  Policy::InstalledDomain silent = Numbered({});
  std::erase_if(silent.rules, [](const Policy::Rule& rule) {
    return rule.words[0].ends_with("kill") || rule.words[0].find("sig") != std::string::npos;
  });
  module->Publish(PlanModule({silent}, CAP_LAST_CAP), 4);
  ExpectRefused(own);
}

}  // namespace
}  // namespace EnforceTest
