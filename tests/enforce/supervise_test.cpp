// Programs that are watched: hunts for calls that are not told, paths that are told otherwise than
// the program means them, and ends that get lost.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <linux/filter.h>
#include <linux/netlink.h>
#include <linux/seccomp.h>
#include <netinet/in.h>
#include <sched.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <exception>
#include <filesystem>
#include <fstream>
#include <map>
#include <set>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

#include "host/enforce/kernel.h"
#include "host/enforce/supervise/asked.h"
#include "host/enforce/supervise/supervisor.h"

namespace EnforceTest {
namespace {

using Enforce::Attempt;
using Enforce::SupervisedEnd;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

constexpr const char* kAccesses[] = {"read", "write", "execute", "list", "remove", "truncate"};

std::string TextOf(const Policy::Question& question) {
  if (const auto* const file = std::get_if<Policy::FileQuestion>(&question)) {
    return std::string(kAccesses[static_cast<int>(file->access)]) + " " + file->path;
  }
  if (const auto* const creation = std::get_if<Policy::CreationQuestion>(&question)) {
    return "make " + creation->what + " " + creation->path;
  }
  if (const auto* const check = std::get_if<Policy::ParameterQuestion>(&question)) {
    return check->check + " " + check->number;
  }
  return std::get<Policy::WordsQuestion>(question).words[0];
}

class SuperviseTest : public testing::Test {
 protected:
  SuperviseTest() {
    std::string name = testing::TempDir() + "supervise-XXXXXX";
    directory = std::filesystem::canonical(mkdtemp(name.data()));
  }
  ~SuperviseTest() override {
    std::filesystem::remove_all(directory);
    close(proc);
  }

  SupervisedEnd Watch(const std::vector<std::string>& command) {
    const Enforce::Supervision supervision = {
        .procDirectory = proc,
        .isNoticed = [](std::string_view call) { return Enforce::AsksMore(call); },
        .notice =
            [&](const Attempt& attempt) {
              if (!attempt.isStart) calls.emplace_back(attempt.call);
              for (const auto& each : attempt.asked) asked.push_back(TextOf(each));
            }};
    return Enforce::Supervise(command, supervision);
  }

  // Runs a script of the shell in the directory.
  int Shell(const std::string& script) {
    return Watch({"/bin/sh", "-c", "cd " + directory + "; " + script}).exitStatus;
  }

  std::string Within(const std::string& name) const { return directory + "/" + name; }
  int Proc() const { return proc; }

  std::string directory;
  std::vector<std::string> calls;
  std::vector<std::string> asked;

 private:
  const int proc = open("/proc", O_PATH | O_DIRECTORY | O_CLOEXEC);
};

TEST_F(SuperviseTest, PassesTheStatusOn) {
  EXPECT_EQ(Shell("exit 7"), 7);
  EXPECT_EQ(Shell("kill -9 $$"), 128 + SIGKILL);
  EXPECT_EQ(Shell("true"), 0);
}

TEST_F(SuperviseTest, SaysWhyThereIsNoProgram) {
  EXPECT_EQ(Watch({"/nowhere/program"}).startError, ENOENT);
  EXPECT_EQ(Watch({"no-such-program"}).startError, ENOENT);
  EXPECT_EQ(Watch({"/etc/passwd"}).startError, EACCES);
  EXPECT_EQ(Watch({"true"}).startError, 0);
}

// Refuses this process the descriptors of others.
bool GiveUpTaking() {
  std::array<sock_filter, 4> filter = {
      {BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
       BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_pidfd_getfd, 0, 1),
       BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EPERM),
       BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW)}};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         Enforce::Kernel::SetFilter(filter.data(), filter.size()) == 0;
}

TEST_F(SuperviseTest, EndsAProgramWhoseCallsItCannotReceive) {
  const pid_t supervisor = fork();
  if (supervisor == 0) {
    if (!GiveUpTaking()) _exit(1);
    alarm(20);
    try {
      Enforce::Supervise({"sleep", "100"}, {.procDirectory = Proc(),
                                            .isKilledAlong = true,
                                            .isNoticed = Enforce::AsksMore,
                                            .notice = [](const Attempt&) {}});
    } catch (const std::exception& failure) {
      const std::string_view text = failure.what();
      _exit(text.starts_with("cannot receive the calls of a program: ") ? 0 : 2);
    }
    _exit(3);
  }
  int status = -1;
  waitpid(supervisor, &status, 0);
  EXPECT_EQ(status, 0);
}

TEST_F(SuperviseTest, TellsPathsAsTheProgramMeansThem) {
  Shell(
      "echo 1 >made; cat ./made; echo 2 >>made; echo 3 >made; mkdir sub; ln -s ../made sub/link; "
      "cat sub/link; ls sub; mv made other; rm other sub/link; rmdir sub; mkfifo pipe");
  EXPECT_THAT(asked, Contains("make regular " + Within("made")));
  EXPECT_THAT(asked, Contains("read " + Within("made")));
  EXPECT_THAT(asked, Contains("write " + Within("made")));
  EXPECT_THAT(asked, Contains("truncate " + Within("made")));
  EXPECT_THAT(asked, Contains("make directory " + Within("sub")));
  EXPECT_THAT(asked, Contains("make symlink " + Within("sub/link")));
  EXPECT_THAT(asked, Contains("list " + Within("sub")));
  EXPECT_THAT(asked, Contains("make regular " + Within("other")));
  EXPECT_THAT(asked, Contains("remove " + Within("other")));
  EXPECT_THAT(asked, Contains("remove " + Within("sub/link")));
  EXPECT_THAT(asked, Contains("remove " + Within("sub")));
  EXPECT_THAT(asked, Contains("make fifo " + Within("pipe")));
  EXPECT_THAT(asked, Not(Contains("read " + Within("sub/link"))));
}

TEST_F(SuperviseTest, LeavesOutWhatIsNotThere) {
  Shell("cat missing; rm -f missing");
  EXPECT_THAT(asked, Not(Contains(testing::HasSubstr("missing"))));
}

TEST_F(SuperviseTest, TellsProgramsWithTheirInterpreters) {
  Shell("printf '#!/bin/sh\\nexit 3\\n' >script; chmod +x script; ./script");
  const std::string shell = std::filesystem::canonical("/bin/sh");
  EXPECT_THAT(asked, Contains("execute " + Within("script")));
  EXPECT_THAT(asked, Contains("read " + Within("script")));
  EXPECT_THAT(asked, Contains("execute " + shell));
  EXPECT_THAT(calls, Contains("execve"));
}

// Calls of this process, that it need not make.
class AskedTest : public SuperviseTest {
 protected:
  using Arguments = std::array<std::uint64_t, 6>;

  static std::vector<std::string> AskedIn(int directoryOfProcesses, int number,
                                          const Arguments& arguments) {
    seccomp_data call = {};
    call.nr = number;
    std::ranges::copy(arguments, call.args);
    std::vector<std::string> texts;
    for (const auto& each :
         Enforce::AskedBy(call, Enforce::Caller(directoryOfProcesses, getpid()))) {
      texts.push_back(TextOf(each));
    }
    return texts;
  }

  // But for capabilities.
  std::vector<std::string> AskedOf(int number, const Arguments& arguments) const {
    std::vector<std::string> texts = AskedIn(Proc(), number, arguments);
    std::erase_if(texts, [](const std::string& text) { return text.starts_with("cap_"); });
    return texts;
  }

  // Only these, of a superuser who has all of them, wherever this runs.
  std::string CapabilitiesOf(int number, const Arguments& arguments) const {
    const std::string own = Within("proc/" + std::to_string(getpid()));
    std::filesystem::create_directories(own);
    for (const std::string name : {"fd", "root"}) {
      std::error_code isThere;
      std::filesystem::create_symlink("/proc/self/" + name, own + "/" + name, isThere);
    }
    std::ofstream(own + "/status") << "Uid:\t0\t1\t2\t3\nGid:\t0\t1\t2\t3\n"
                                   << "CapEff:\tffffffffffffffff\n";
    const Enforce::FileDescriptor made(open(Within("proc").c_str(), O_PATH | O_CLOEXEC));
    std::string found;
    for (const std::string& text : AskedIn(made.Number(), number, arguments)) {
      if (text.starts_with("cap_")) found += (found.empty() ? "" : " ") + text;
    }
    return found;
  }

  static std::vector<std::string> Only(const std::string& question) { return {question}; }

  static std::uint64_t AddressOf(const std::string& text) {
    return reinterpret_cast<std::uintptr_t>(text.c_str());
  }
};

TEST_F(AskedTest, TakesWhatIsCheckedFromItsArgument) {
  const std::map<int, std::vector<std::string>> expected = {
      {SYS_clone, {"clone_flags 11"}},
      {SYS_unshare, {"clone_flags 11"}},
      {SYS_ioctl, {"ioctl_request 12"}},
      {SYS_prctl, {"prctl_option 11"}},
      {SYS_kill, {"kill_signal 12"}},
      {SYS_tkill, {"kill_signal 12"}},
      {SYS_tgkill, {"kill_signal 13"}},
      {SYS_rt_sigqueueinfo, {"kill_signal 12"}},
      {SYS_rt_tgsigqueueinfo, {"kill_signal 13"}},
      {SYS_pidfd_send_signal, {"kill_signal 12"}},
      {SYS_socket, {"socket_family 11", "socket_type 12"}},
      {SYS_socketpair, {"socket_family 11", "socket_type 12"}},
      {SYS_setuid, {"set_uid 11"}},
      {SYS_setfsuid, {"set_uid 11"}},
      {SYS_setreuid, {"set_uid 11", "set_uid 12"}},
      {SYS_setresuid, {"set_uid 11", "set_uid 12", "set_uid 13"}},
      {SYS_setgid, {"set_gid 11"}},
      {SYS_setfsgid, {"set_gid 11"}},
      {SYS_setregid, {"set_gid 11", "set_gid 12"}},
      {SYS_setresgid, {"set_gid 11", "set_gid 12", "set_gid 13"}},
  };
  for (const auto& [number, questions] : expected) {
    EXPECT_EQ(AskedOf(number, {11, 12, 13, 14, 15, 16}), questions) << number;
  }
}

TEST_F(AskedTest, TellsFilesByTheArgumentsThatNameThem) {
  const std::string oldName = Within("old");
  const std::string newName = Within("new");
  const std::string sub = Within("sub");
  std::ofstream(oldName).put('x');
  std::filesystem::create_directory(sub);
  constexpr auto kHere = static_cast<std::uint64_t>(AT_FDCWD);
  const std::uint64_t there = AddressOf(oldName);
  const std::uint64_t missing = AddressOf(newName);
  const std::vector<std::string> made = {"make regular " + newName};
  const std::vector<std::string> moved = {"remove " + oldName, "make regular " + newName};
  const std::vector<std::string> removed = {"remove " + oldName};
  const std::vector<std::string> written = {"make regular " + newName, "write " + newName};
  EXPECT_EQ(AskedOf(SYS_linkat, {kHere, there, kHere, missing}), made);
  EXPECT_EQ(AskedOf(SYS_symlinkat, {there, kHere, missing}), Only("make symlink " + newName));
  EXPECT_EQ(AskedOf(SYS_mkdirat, {kHere, missing}), Only("make directory " + newName));
  EXPECT_EQ(AskedOf(SYS_mknodat, {kHere, missing, S_IFIFO}), Only("make fifo " + newName));
  EXPECT_EQ(AskedOf(SYS_openat, {kHere, there, O_RDONLY}), Only("read " + oldName));
  EXPECT_EQ(AskedOf(SYS_openat, {kHere, missing, O_CREAT | O_WRONLY}), written);
  EXPECT_EQ(AskedOf(SYS_renameat2, {kHere, there, kHere, missing, 0}), moved);
  EXPECT_EQ(AskedOf(SYS_truncate, {there}), Only("truncate " + oldName));
  EXPECT_EQ(AskedOf(SYS_unlinkat, {kHere, there}), removed);
// Newer architectures are without them.
#ifdef SYS_open
  EXPECT_EQ(AskedOf(SYS_creat, {missing}), written);
  EXPECT_EQ(AskedOf(SYS_link, {there, missing}), made);
  EXPECT_EQ(AskedOf(SYS_mkdir, {missing}), Only("make directory " + newName));
  EXPECT_EQ(AskedOf(SYS_mknod, {missing, S_IFIFO}), Only("make fifo " + newName));
  EXPECT_EQ(AskedOf(SYS_open, {there, O_WRONLY}), Only("write " + oldName));
  EXPECT_EQ(AskedOf(SYS_rename, {there, missing}), moved);
  EXPECT_EQ(AskedOf(SYS_renameat, {kHere, there, kHere, missing}), moved);
  EXPECT_EQ(AskedOf(SYS_rmdir, {AddressOf(sub)}), Only("remove " + sub));
  EXPECT_EQ(AskedOf(SYS_symlink, {there, missing}), Only("make symlink " + newName));
  EXPECT_EQ(AskedOf(SYS_unlink, {there}), removed);
#endif
}

TEST_F(AskedTest, TellsLinksThatAreNotFollowed) {
  const std::string file = Within("file");
  const std::string link = Within("link");
  std::ofstream(file).put('x');
  std::filesystem::create_symlink(file, link);
  const auto readOf = [&](std::uint64_t flags) {
    return AskedOf(SYS_openat, {static_cast<std::uint64_t>(AT_FDCWD), AddressOf(link), flags});
  };
  EXPECT_EQ(readOf(O_RDONLY), Only("read " + file));
  EXPECT_EQ(readOf(O_RDONLY | O_CREAT), Only("read " + file));
  EXPECT_EQ(readOf(O_RDONLY | O_NOFOLLOW), Only("read " + link));
  EXPECT_EQ(readOf(O_RDONLY | O_CREAT | O_EXCL), Only("read " + link));
}

TEST_F(AskedTest, TellsCapabilitiesByTheCall) {
  const std::map<std::string, std::vector<int>> expected = {
      {"cap_ipc_lock", {SYS_mlockall}},
      {"cap_dac_read_search", {SYS_open_by_handle_at}},
      {"cap_setgid", {SYS_setgroups}},
      {"cap_sys_admin",
       {SYS_mount, SYS_move_mount, SYS_pivot_root, SYS_setdomainname, SYS_sethostname, SYS_setns,
        SYS_swapoff, SYS_swapon, SYS_umount2}},
      {"cap_sys_boot", {SYS_kexec_load, SYS_reboot}},
      {"cap_sys_chroot", {SYS_chroot}},
      {"cap_sys_module", {SYS_delete_module, SYS_finit_module, SYS_init_module}},
      {"cap_sys_pacct", {SYS_acct}},
      {"cap_sys_time", {SYS_clock_settime, SYS_settimeofday}},
      {"cap_sys_tty_config", {SYS_vhangup}},
      {"", {SYS_read, SYS_getpid}},
  };
  for (const auto& [capability, numbers] : expected) {
    for (const int number : numbers) EXPECT_EQ(CapabilitiesOf(number, {}), capability) << number;
  }
}

TEST_F(AskedTest, TellsCapabilitiesByTheArguments) {
  const struct {
    std::string capability;
    int number;
    std::vector<Arguments> taking;
    std::vector<Arguments> free;
  } expected[] = {
      {"cap_sys_resource", SYS_prctl, {{PR_SET_MM}}, {{PR_SET_NO_NEW_PRIVS}, {PR_GET_DUMPABLE}}},
      {"cap_setpcap", SYS_prctl, {{PR_CAPBSET_DROP}, {PR_SET_SECUREBITS}}, {{PR_CAPBSET_READ}}},
      {"cap_net_admin",
       SYS_setsockopt,
       {{0, SOL_SOCKET, SO_MARK},
        {0, SOL_SOCKET, SO_SNDBUFFORCE},
        {0, SOL_SOCKET, SO_RCVBUFFORCE},
        {0, IPPROTO_IP, IP_TRANSPARENT}},
       {{0, SOL_SOCKET, SO_REUSEADDR}, {0, IPPROTO_IP, SO_MARK}, {0, SOL_SOCKET, IP_TRANSPARENT}}},
      {"cap_net_raw",
       SYS_socket,
       {{AF_INET, SOCK_RAW}, {AF_INET6, SOCK_RAW | SOCK_CLOEXEC}, {AF_PACKET, SOCK_DGRAM}},
       {{AF_INET, SOCK_DGRAM}, {AF_NETLINK, SOCK_RAW}}},
      {"cap_audit_write",
       SYS_socket,
       {{AF_NETLINK, SOCK_RAW, NETLINK_AUDIT}},
       {{AF_INET, SOCK_DGRAM, NETLINK_AUDIT}}},
      {"cap_sys_nice",
       SYS_sched_setscheduler,
       {{0, SCHED_FIFO}, {0, SCHED_RR | SCHED_RESET_ON_FORK}},
       {{0, SCHED_OTHER}, {0, SCHED_RESET_ON_FORK}}},
      {"cap_sys_nice", SYS_setpriority, {{0, 0, static_cast<std::uint64_t>(-1)}}, {{}, {0, 0, 1}}},
      {"cap_mknod", SYS_mknodat, {{0, 0, S_IFCHR}, {0, 0, S_IFBLK}}, {{0, 0, S_IFIFO}}},
      {"cap_sys_admin",
       SYS_unshare,
       {{CLONE_NEWNS},
        {CLONE_NEWCGROUP},
        {CLONE_NEWUTS},
        {CLONE_NEWIPC},
        {CLONE_NEWPID},
        {CLONE_NEWNET}},
       {{CLONE_FILES}, {CLONE_NEWUSER | CLONE_NEWNS}}},
      {"cap_sys_admin", SYS_clone, {{CLONE_NEWNS}}, {{SIGCHLD}}},
      {"cap_setuid", SYS_setuid, {{4}}, {{0}, {1}, {2}}},
      {"cap_setuid", SYS_setreuid, {{0, 4}}, {{0, 1, 4}}},
      {"cap_setuid", SYS_setresuid, {{0, 1, 4}}, {{0, 1, 2}, {UINT32_MAX, 1, UINT32_MAX}}},
      {"cap_setgid", SYS_setregid, {{0, 4}}, {{0, 1, 4}}},
  };
  for (const auto& [capability, number, taking, free] : expected) {
    for (const auto& each : taking) EXPECT_EQ(CapabilitiesOf(number, each), capability) << number;
    for (const auto& each : free) EXPECT_EQ(CapabilitiesOf(number, each), "") << number;
  }
}

// Newer architectures are without them.
#ifdef SYS_lchown
TEST_F(AskedTest, TellsLinksThatAreGivenAway) {
  const std::string link = Within("link");
  std::filesystem::create_symlink("nowhere", link);
  EXPECT_EQ(CapabilitiesOf(SYS_lchown, {AddressOf(link), 4, 4}), "cap_chown");
  EXPECT_EQ(CapabilitiesOf(SYS_chown, {AddressOf(link), 4, 4}), "");
}
#endif

TEST_F(AskedTest, TellsNoBindThatFails) {
  const Enforce::FileDescriptor made(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const auto number = static_cast<std::uint64_t>(made.Number());
  sockaddr_in local = {};
  local.sin_family = AF_INET;
  const auto address = reinterpret_cast<std::uintptr_t>(&local);
  EXPECT_THAT(AskedOf(SYS_bind, {number, address, sizeof local}), Contains("bind_port 0"));
  EXPECT_THAT(AskedOf(SYS_bind, {number, 0, sizeof local}), IsEmpty());
  const auto closed = static_cast<std::uint64_t>(-1);
  EXPECT_THAT(AskedOf(SYS_bind, {closed, address, sizeof local}), IsEmpty());
}

TEST_F(AskedTest, TellsLimitsThatAreRaised) {
  rlimit limit = {};
  ASSERT_EQ(getrlimit(RLIMIT_NOFILE, &limit), 0);
  const auto taken = [&] {
    const auto address = reinterpret_cast<std::uintptr_t>(&limit);
    const std::string oneself = CapabilitiesOf(SYS_prlimit64, {0, RLIMIT_NOFILE, address});
    EXPECT_EQ(CapabilitiesOf(SYS_setrlimit, {RLIMIT_NOFILE, address}), oneself);
    return oneself;
  };
  EXPECT_EQ(taken(), "");
  ++limit.rlim_max;
  EXPECT_EQ(taken(), "cap_sys_resource");
  limit.rlim_max = 0;
  EXPECT_EQ(taken(), "");
}

TEST_F(AskedTest, TakesALoaderFromAProgramOnly) {
  std::ifstream program("/proc/self/exe", std::ios::binary);
  std::string content(4096, '\0');
  program.read(content.data(), static_cast<std::streamsize>(content.size()));
  const std::string file = Within("program");
  const auto askedOf = [&] {
    std::ofstream(file) << content;
    return AskedOf(SYS_execve, {AddressOf(file)});
  };
  EXPECT_THAT(askedOf(), testing::SizeIs(4));
  content.front() = 'x';
  EXPECT_THAT(askedOf(), ElementsAre("execute " + file, "read " + file));
}

// What only root can lay out.
class PrivilegesTest : public SuperviseTest {
 protected:
  static constexpr uid_t kOther = 65534;

  void SetUp() override {
    if (geteuid() != 0) GTEST_SKIP() << "only root has capabilities to be told of";
    chmod(directory.c_str(), 0755);
  }

  // Makes a file of another user.
  void MakeOthers(const std::string& name, mode_t mode) {
    std::ofstream(Within(name)) << "text\n";
    Give(name, kOther, mode);
  }

  // Without the modes that a change of owners takes away.
  void Give(const std::string& name, uid_t user, mode_t mode) {
    ASSERT_EQ(chown(Within(name).c_str(), user, user), 0);
    ASSERT_EQ(chmod(Within(name).c_str(), mode), 0);
  }

  // The capabilities that the script was told to take.
  std::vector<std::string> Taken(const std::string& script) {
    asked.clear();
    Shell(script);
    std::set<std::string> taken;
    for (const std::string& each : asked) {
      if (each.starts_with("cap_")) taken.insert(each);
    }
    return {taken.begin(), taken.end()};
  }
};

TEST_F(PrivilegesTest, TellsModesThatRootOverrides) {
  MakeOthers("open", 0644);
  MakeOthers("closed", 0600);
  std::filesystem::create_directory(Within("sub"));
  std::ofstream(Within("sub/own")) << "text\n";
  EXPECT_THAT(Taken("cat open"), IsEmpty());
  EXPECT_THAT(Taken("cat closed"), ElementsAre("cap_dac_read_search"));
  EXPECT_THAT(Taken("echo more >>open"), ElementsAre("cap_dac_override"));
  EXPECT_THAT(Taken("cat sub/own; ls sub; echo >sub/new; rm sub/new"), IsEmpty());
  Give("sub", kOther, 0755);
  EXPECT_THAT(Taken("cat sub/own; ls sub"), IsEmpty());
  EXPECT_THAT(Taken("echo >sub/new"), ElementsAre("cap_dac_override"));
  EXPECT_THAT(Taken("rm sub/new"), ElementsAre("cap_dac_override"));
  Give("sub", kOther, 0700);
  EXPECT_THAT(Taken("cat sub/own"), ElementsAre("cap_dac_read_search"));
  EXPECT_THAT(Taken("ls sub"), ElementsAre("cap_dac_read_search"));
  EXPECT_THAT(Taken("cd sub"), ElementsAre("cap_dac_read_search"));
}

TEST_F(PrivilegesTest, LooksAtDirectoriesOnTheWayAndNotAboveWhereItIs) {
  std::filesystem::create_directories(Within("closed/sub"));
  std::ofstream(Within("closed/sub/file")) << "text\n";
  Give("closed", kOther, 0700);
  EXPECT_THAT(Taken("cat closed/sub/file"), ElementsAre("cap_dac_read_search"));
  std::filesystem::current_path(Within("closed/sub"));
  asked.clear();
  Watch({"/bin/cat", "file"});
  std::filesystem::current_path("/");
  EXPECT_THAT(asked, Contains("read " + Within("closed/sub/file")));
  EXPECT_THAT(asked, Not(Contains(StartsWith("cap_"))));
}

TEST_F(PrivilegesTest, TellsWhatOnlyOwnersMay) {
  MakeOthers("others", 0666);
  std::ofstream(Within("own")) << "text\n";
  EXPECT_THAT(Taken("chmod 600 own; touch -d 2001-01-01 own; chown 0:0 own"), IsEmpty());
  EXPECT_THAT(Taken("chmod 666 others"), ElementsAre("cap_fowner"));
  EXPECT_THAT(Taken("touch -d 2001-01-01 others"), ElementsAre("cap_fowner"));
  EXPECT_THAT(Taken("touch others"), IsEmpty());
  EXPECT_THAT(Taken("chown 65534 own"), ElementsAre("cap_chown"));
  std::filesystem::create_directory(Within("sticky"));
  Give("sticky", 1, 01777);
  MakeOthers("sticky/others", 0644);
  EXPECT_THAT(Taken("rm -f sticky/others"), ElementsAre("cap_fowner"));
}

TEST_F(PrivilegesTest, TellsSignalsAndLimits) {
  EXPECT_THAT(Taken("sleep 5 & kill $!"), IsEmpty());
  EXPECT_THAT(Taken("setpriv --reuid 65534 --clear-groups sleep 5 & sleep 0.3; kill $!"),
              ElementsAre("cap_kill", "cap_setgid", "cap_setuid"));
  EXPECT_THAT(Taken("ulimit -n 100; ulimit -S -n 50"), IsEmpty());
  const bool mayRaise = prctl(PR_CAPBSET_READ, CAP_SYS_RESOURCE, 0, 0, 0) == 1;
  const std::vector<std::string> taken = Taken("ulimit -n 100; ulimit -n 200");
  EXPECT_EQ(!taken.empty(), mayRaise);
}

TEST_F(PrivilegesTest, TellsWhatProcessesTakeFromThemselves) {
  EXPECT_THAT(Taken("setpriv --no-new-privs true"), IsEmpty());
  EXPECT_THAT(Taken("setpriv --bounding-set=-sys_boot true"), ElementsAre("cap_setpcap"));
}

TEST_F(PrivilegesTest, TellsNobodyElseOfAny) {
  MakeOthers("closed", 0600);
  const std::string script = "cd " + directory + "; cat closed; chmod 777 closed; kill -0 1";
  Watch({"/bin/sh", "-c", "exec setpriv --reuid 1 --clear-groups /bin/sh -c '" + script + "'"});
  EXPECT_THAT(asked, Contains("read " + Within("closed")));
  EXPECT_THAT(asked, Not(Contains("cap_dac_read_search")));
  EXPECT_THAT(asked, Not(Contains("cap_fowner")));
  EXPECT_THAT(asked, Not(Contains("cap_kill")));
}

TEST_F(SuperviseTest, EntersWithoutAnExecveOfItsOwn) {
  Watch({"/bin/true"});
  EXPECT_THAT(calls, Not(Contains("execve")));
  EXPECT_THAT(asked, Contains("execute " + std::filesystem::canonical("/bin/true").string()));
}

TEST_F(SuperviseTest, WaitsForWhatIsLeftBehind) {
  EXPECT_EQ(Shell("(sleep 0.2; echo >late) & exit 4"), 4);
  EXPECT_THAT(asked, Contains("make regular " + Within("late")));
}

TEST_F(SuperviseTest, HandsSignalsOn) {
  const pid_t supervisor = fork();
  if (supervisor == 0) {
    _exit(Shell("trap 'exit 9' TERM; echo >ready; while :; do sleep 0.05; done"));
  }
  while (!std::filesystem::exists(Within("ready"))) usleep(10'000);
  kill(supervisor, SIGTERM);
  int status = 0;
  waitpid(supervisor, &status, 0);
  EXPECT_TRUE(WIFEXITED(status));
  EXPECT_EQ(WEXITSTATUS(status), 9);
}

// The one that is left behind knows that its parent was seen to end when it is no process any more.
TEST_F(SuperviseTest, HandsSignalsOnToWhatIsLeftBehind) {
  const pid_t supervisor = fork();
  if (supervisor == 0) {
    _exit(
        Shell("(trap 'echo >ended; exit' TERM; while kill -0 $$; do sleep 0.05; done; echo >ready; "
              "n=0; while [ $n -lt 100 ]; do n=$((n+1)); sleep 0.05; done) 2>&- & exit 4"));
  }
  while (!std::filesystem::exists(Within("ready"))) usleep(10'000);
  kill(supervisor, SIGTERM);
  int status = 0;
  waitpid(supervisor, &status, 0);
  EXPECT_EQ(WEXITSTATUS(status), 4);
  EXPECT_TRUE(std::filesystem::exists(Within("ended")));
}

}  // namespace
}  // namespace EnforceTest
