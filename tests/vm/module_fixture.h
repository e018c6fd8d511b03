#pragma once

#include <fcntl.h>
#include <gmock/gmock.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <linux/sched.h>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <fstream>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "braxo/lib/exception.h"
#include "enforce/domain_of.h"
#include "host/enforce/module/module.h"
#include "host/enforce/system_calls.h"

// The running module, and processes whose acts it judges.
namespace EnforceTest {

using Enforce::Module;
using Enforce::ModulePlan;
using Enforce::PlanModule;
using Policy::Level;

inline constexpr unsigned int kDomain = 5;
inline constexpr unsigned int kOther = 6;
inline constexpr std::uint64_t kChroot = std::uint64_t{1} << CAP_SYS_CHROOT;
inline constexpr std::uint64_t kAll = ~std::uint64_t{0};

// 0 or the error number of an act.
using Act = std::function<int()>;

inline int ErrorOf(long result) { return result < 0 ? errno : 0; }

inline int ChangeRoot() { return ErrorOf(chroot("/")); }

inline int ResultOf(pid_t child) {
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : 1000 + WTERMSIG(status);
}

// 0 or the error of a clone that ends at once.
inline int Clone(std::uint64_t flags) {
  clone_args arguments = {};
  arguments.flags = flags;
  arguments.exit_signal = SIGCHLD;
  const long child = syscall(SYS_clone3, &arguments, sizeof(arguments));
  if (child == 0) _exit(0);
  return child < 0 ? errno : ResultOf(static_cast<pid_t>(child));
}

inline int InChild(const Act& act) {
  const pid_t child = fork();
  if (child == 0) _exit(act());
  return ResultOf(child);
}

// ---- Who tries it

inline constexpr unsigned int kUser = 65534;

// An ordinary user, whose processes may look at each other.
inline int BecomeUser() {
  if (setgroups(0, nullptr) != 0 || setresgid(kUser, kUser, kUser) != 0) return errno;
  if (setresuid(kUser, kUser, kUser) != 0) return errno;
  return ErrorOf(prctl(PR_SET_DUMPABLE, 1, 0, 0, 0));
}

inline bool WriteTo(const char* path, const std::string& text) {
  std::ofstream file(path);
  return static_cast<bool>(file << text << std::flush);
}

// Root of a user namespace of its own, with all capabilities there, and nobody outside.
inline int BecomeRootOfNamespace() {
  if (const int error = BecomeUser()) return error;
  if (unshare(CLONE_NEWUSER | CLONE_NEWNS) != 0) return errno;
  const std::string map = "0 " + std::to_string(kUser) + " 1";
  const bool isMapped = WriteTo("/proc/self/uid_map", map) &&
                        WriteTo("/proc/self/setgroups", "deny") &&
                        WriteTo("/proc/self/gid_map", map);
  return isMapped ? 0 : EINVAL;
}

// ----

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

inline std::string MessageOf(const std::function<void()>& act) {
  try {
    act();
  } catch (const Braxo::Lib::BraxoException& exception) {
    return exception.what();
  }
  return "nothing was thrown";
}

inline bool KernelRunsPrograms() {
  std::ifstream file("/sys/kernel/security/lsm");
  const std::string modules{std::istreambuf_iterator<char>(file), {}};
  return ("," + modules + ",").find(",bpf,") != std::string::npos;
}

// What keeps nobody from files.
inline constexpr const char* kAllFiles = "-r / rwx";

// A rule for each system call.
inline const std::vector<Policy::Rule>& AllCalls() {
  static const std::vector<Policy::Rule> all = [] {
    std::vector<Policy::Rule> rules;
    for (const auto calls : {Enforce::SystemCalls(), Enforce::SystemCallsOf32Bits()}) {
      for (const Enforce::SystemCall& call : calls)
        rules.push_back(RuleOf("-s " + call.name + " grant"));
    }
    return rules;
  }();
  return all;
}

// With every system call granted besides, of which a domain without rules for them has none.
inline Policy::InstalledDomain WithCalls(Policy::InstalledDomain domain) {
  domain.rules.insert(domain.rules.end(), AllCalls().begin(), AllCalls().end());
  return domain;
}

// kDomain, with these rules and every system call.
inline Policy::InstalledDomain NumberedStrictly(const std::vector<std::string>& rules) {
  Policy::InstalledDomain domain = DomainOf(rules);
  domain.id = kDomain;
  return WithCalls(std::move(domain));
}

// It may use all files besides.
inline Policy::InstalledDomain Numbered(std::vector<std::string> rules) {
  rules.emplace_back(kAllFiles);
  return NumberedStrictly(rules);
}

class ModuleTest : public testing::Test {
 protected:
  void SetUp() override {
    if (!KernelRunsPrograms()) GTEST_SKIP() << "bpf is not among this kernel's security modules";
    module = Module::FindRunning();
    if (!module) module = Module::Start();
    module->Publish(Granting(kChroot), 1);
  }

  // To load it takes most of the time, so it is done by tests of what it takes with it.
  void Restart() {
    Module::Stop();
    module = Module::Start();
  }

  // kDomain may use these capabilities and kOther all. Nothing else keeps anybody from anything.
  static ModulePlan Granting(std::uint64_t capabilities, Level level = Level::kEnforcing) {
    static const Policy::InstalledDomain open = Numbered({});
    Policy::InstalledDomain domain = open;
    domain.level = level;
    Policy::InstalledDomain other = open;
    other.id = kOther;
    ModulePlan plan = PlanModule({domain, other}, CAP_LAST_CAP);
    plan[0].rules.capabilities = capabilities;
    plan[1].rules.capabilities = kAll;
    return plan;
  }

  // What comes of an act in a domain.
  int In(unsigned int domain, const Act& act) {
    const Worker worker(act);
    module->Place(worker.Process(), domain);
    return worker.Do();
  }

  // What comes of an act of who has made ready for it outside of the domain.
  int InAfter(unsigned int domain, const Act& prepare, const Act& act) {
    bool isReady = false;
    const Worker worker([&] { return std::exchange(isReady, true) ? act() : prepare(); });
    EXPECT_EQ(worker.Do(), 0);
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

}  // namespace EnforceTest
