// Filters in the kernel: hunts for a program that it does not take or understands otherwise. Each
// refusal has beside it the same call without a filter, which has to work.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/filter.h>
#include <linux/sched.h>
#include <linux/seccomp.h>
#include <netinet/in.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <utility>

#include "enforce/domain_of.h"
#include "host/enforce/plan/call_plan.h"

namespace EnforceTest {
namespace {

using Enforce::CallPlan;
using Enforce::PlanCalls;
using Filter = std::vector<sock_filter>;

constexpr int kNotInstalled = 250;

// What a child does; what it returns is its errno, or 0.
using Deed = int (*)();

bool Install(Filter& filter) {
  sock_fprog program = {static_cast<unsigned short>(filter.size()), filter.data()};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         syscall(SYS_seccomp, SECCOMP_SET_MODE_FILTER, 0, &program) == 0;
}

std::string OutcomeOf(pid_t child) {
  int status = 0;
  if (waitpid(child, &status, 0) != child) return "no child";
  if (WIFSIGNALED(status)) return "killed by " + std::to_string(WTERMSIG(status));
  if (WEXITSTATUS(status) == kNotInstalled) return "not installed";
  return WEXITSTATUS(status) == 0 ? "works" : strerrorname_np(WEXITSTATUS(status));
}

// As _exit does, but without what a sanitizer does before.
void Exit(int status) { syscall(SYS_exit_group, status); }

// The filter is installed in a child; none where it is empty. Only system calls from there on.
std::string Try(Filter filter, Deed deed) {
  const pid_t child = fork();
  if (child == 0) {
    if (!filter.empty() && !Install(filter)) Exit(kNotInstalled);
    Exit(deed());
  }
  return OutcomeOf(child);
}

int ErrorOf(long result) { return result < 0 ? errno : 0; }

// What the deed comes to in a domain that may exit and do what `lines` say.
std::string Confined(std::vector<std::string> lines, Deed deed) {
  EXPECT_EQ(Try({}, deed), "works") << "without a filter";
  lines.emplace_back("-s exit_group grant");
  return Try(PlanCalls(DomainOf(lines)).program, deed);
}

int OpenSocket(int family, int type, int protocol) {
  return ErrorOf(syscall(SYS_socket, family, type, protocol));
}

int CloneAndWait(unsigned long flags) {
  const long child = syscall(SYS_clone, flags | SIGCHLD, 0, 0, 0, 0);
  if (child == 0) syscall(SYS_exit_group, 0);
  return ErrorOf(child);
}

TEST(Filter, AllowsAndRefusesCalls) {
  const Deed getParent = [] { return ErrorOf(syscall(SYS_getppid)); };
  EXPECT_EQ(Confined({"-s getppid grant"}, getParent), "works");
  EXPECT_EQ(Confined({"-s @process grant"}, getParent), "works");
  EXPECT_EQ(Confined({"-s getpid grant"}, getParent), "EPERM");
  EXPECT_EQ(Confined({"-s @process grant", "-s getppid revoke"}, getParent), "EPERM");
}

TEST(Filter, AnswersAsAKernelWithoutTheCall) {
  const Deed unknown = [] { return syscall(999) == -1 && errno == ENOSYS ? 0 : 1; };
  EXPECT_EQ(Confined({}, unknown), "works");
  const Deed newer = [] {
    const long result = syscall(SYS_clone3, nullptr, 0);
    return result == -1 && errno == EINVAL ? 0 : errno;
  };
  EXPECT_EQ(Confined({"-s clone3 grant"}, newer), "ENOSYS");
}

TEST(Filter, SeesArguments) {
  const Deed stream = [] { return OpenSocket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0); };
  const Deed datagram = [] { return OpenSocket(AF_UNIX, SOCK_DGRAM, 0); };
  const std::vector<std::string> lines = {"-s socket grant", "-p socket_type 1 grant"};
  EXPECT_EQ(Confined(lines, stream), "works");
  EXPECT_EQ(Confined(lines, datagram), "EPERM");
  const Deed withHighBits = [] {
    return ErrorOf(syscall(SYS_socket, 1L << 32 | AF_UNIX, 1L << 32 | SOCK_DGRAM, 0));
  };
  EXPECT_EQ(Confined(lines, withHighBits), "EPERM");
}

TEST(Filter, SeesSignals) {
  const Deed probe = [] { return ErrorOf(syscall(SYS_kill, 0, 0)); };
  const Deed urgent = [] {
    return ErrorOf(syscall(SYS_tgkill, syscall(SYS_getpid), syscall(SYS_gettid), SIGURG));
  };
  const std::vector<std::string> lines = {"-s @signal grant", "-s @process grant",
                                          "-p kill_signal 0 grant"};
  EXPECT_EQ(Confined(lines, probe), "works");
  EXPECT_EQ(Confined(lines, urgent), "EPERM");
}

TEST(Filter, RefusesNamespaces) {
  const Deed fork = [] { return CloneAndWait(0); };
  const Deed namespaced = [] { return CloneAndWait(CLONE_NEWUSER); };
  const Deed unshared = [] { return ErrorOf(syscall(SYS_unshare, CLONE_NEWUSER)); };
  const std::vector<std::string> lines = {"-s clone grant", "-s unshare grant"};
  EXPECT_EQ(Confined(lines, fork), "works");
  if (Try({}, unshared) != "works") GTEST_SKIP() << "no user namespaces here";
  EXPECT_EQ(Confined(lines, namespaced), "EPERM");
  EXPECT_EQ(Confined(lines, unshared), "EPERM");
  EXPECT_EQ(Confined({"-s unshare grant", "-p clone_flags 0x10000000 grant"}, unshared), "works");
}

TEST(Filter, LeavesOnlyTcpBesidePorts) {
  const Deed tcp = [] { return OpenSocket(AF_INET, SOCK_STREAM, 0); };
  const Deed udp = [] { return OpenSocket(AF_INET, SOCK_DGRAM, 0); };
  const std::vector<std::string> lines = {"-s socket grant", "-p connect_port 443 grant"};
  EXPECT_EQ(Confined(lines, tcp), "works");
  EXPECT_EQ(Confined(lines, udp), "EPERM");
  EXPECT_EQ(Confined({"-s socket grant"}, udp), "works");
}

TEST(Filter, LeavesOnlyTcpWhereThereIsMultipath) {
  const Deed multipath = [] { return OpenSocket(AF_INET, SOCK_STREAM, 262); };
  if (Try({}, multipath) != "works") GTEST_SKIP() << "no multipath TCP here";
  EXPECT_EQ(Confined({"-s socket grant", "-p connect_port 443 grant"}, multipath), "EPERM");
  EXPECT_EQ(Confined({"-s socket grant"}, multipath), "works");
}

// Opens a file in memory once more; an error, too, where it has not become what the flags say.
int OpenAgain(int flags) {
  const auto file = static_cast<int>(syscall(SYS_memfd_create, "file", 0));
  if (syscall(SYS_write, file, "text", 4) != 4) return EIO;
  const std::string path = "/proc/self/fd/" + std::to_string(file);
  if (syscall(SYS_openat, AT_FDCWD, path.c_str(), flags, 0) < 0) return errno;
  const bool isEmpty = syscall(SYS_lseek, file, 0, SEEK_END) == 0;
  return isEmpty == ((flags & O_TRUNC) != 0) ? 0 : EIO;
}

TEST(Filter, TruncatesNothingThatIsNotOpenedForWriting) {
  const auto confined = [](Deed deed) {
    EXPECT_EQ(Try({}, deed), "works") << "without a filter";
    const std::vector<std::string> lines = {"-s memfd_create grant", "-s write grant",
                                            "-s openat grant", "-s lseek grant",
                                            "-s exit_group grant"};
    return Try(PlanCalls(DomainOf(lines), Enforce::Truncation::kByFilter).program, deed);
  };
  EXPECT_EQ(confined([] { return OpenAgain(O_RDONLY); }), "works");
  EXPECT_EQ(confined([] { return OpenAgain(O_RDONLY | O_TRUNC); }), "EACCES");
  EXPECT_EQ(confined([] { return OpenAgain(O_ACCMODE | O_TRUNC); }), "EACCES");
  EXPECT_EQ(confined([] { return OpenAgain(O_WRONLY | O_TRUNC); }), "works");
}

// /dev/null is no terminal, and says so where it is asked.
TEST(Filter, RefusesTypingIntoTheTerminal) {
  const Deed type = [] {
    const auto null = static_cast<int>(syscall(SYS_openat, AT_FDCWD, "/dev/null", O_RDWR, 0));
    const long result = syscall(SYS_ioctl, null, 1UL << 32 | TIOCSTI, "x");
    return result == -1 && errno == ENOTTY ? 0 : errno;
  };
  const std::vector<std::string> lines = {"-s openat grant", "-s ioctl grant"};
  EXPECT_EQ(Confined(lines, type), "EPERM");
  EXPECT_EQ(Confined({"-s openat grant", "-s ioctl grant", "-p ioctl_request 0x5412 grant"}, type),
            "works");
}

#if defined(__x86_64__)
TEST(Filter, KillsWhoCallsByTheSecondTable) {
  const Deed byX32 = [] {
    syscall(0x4000'0000 | SYS_getpid);
    return 0;
  };
  EXPECT_EQ(Confined({"-s getpid grant"}, byX32), "killed by " + std::to_string(SIGSYS));
}

TEST(Filter, KillsWhoCallsAsAnI386) {
  const Deed byInterrupt = [] {
    constexpr long kGetpid = 20;
    long result = kGetpid;
    asm volatile("int $0x80" : "+a"(result) : : "memory", "r8", "r9", "r10", "r11");
    return result > 0 ? 0 : ENOSYS;
  };
  if (Try({}, byInterrupt) != "works") GTEST_SKIP() << "no calls of i386 here";
  EXPECT_EQ(Confined({"-s getpid grant"}, byInterrupt), "killed by " + std::to_string(SIGSYS));
}
#endif

// ---- The entry

constexpr std::uint64_t kSecret = 0xfeed'beef'1234'5678;

int Execute(std::uint64_t secret) {
  const char* const arguments[] = {"/bin/true", nullptr};
  const char* const environment[] = {nullptr};
  return ErrorOf(syscall(SYS_execve, "/bin/true", arguments, environment, 0, 0, secret));
}

TEST(Filter, LetsOneProgramStartByTheSecret) {
  const Deed plain = [] { return Execute(0); };
  const Deed withSecret = [] { return Execute(kSecret); };
  CallPlan plan = PlanCalls(DomainOf({"-s @start grant"}));
  ASSERT_TRUE(plan.secret);
  EXPECT_EQ(Try({}, plain), "works");
  EXPECT_EQ(Try(plan.program, withSecret), "EPERM") << "before it is set";
  SetSecret(plan.program.data(), *plan.secret, kSecret);
  EXPECT_EQ(Try(plan.program, withSecret), "works");
  EXPECT_EQ(Try(plan.program, plain), "EPERM");
}

// ---- Whatever the plan

TEST(Filter, IsTakenHoweverLongItIs) {
  std::vector<std::string> lines = {"-s exit_group grant", "-s prctl grant", "-s kill grant",
                                    "-s getppid grant"};
  for (int value = 100; value < 900; ++value) {
    lines.push_back("-p prctl_option " + std::to_string(2 * value) + " grant");
  }
  const CallPlan plan = PlanCalls(DomainOf(lines));
  EXPECT_GT(plan.program.size(), 3000U);
  EXPECT_EQ(Try(plan.program, [] { return ErrorOf(syscall(SYS_getppid)); }), "works");
}

}  // namespace
}  // namespace EnforceTest
