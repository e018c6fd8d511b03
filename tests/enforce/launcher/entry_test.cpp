// What a confined program is left with: hunts for descriptors, calls, signals, capabilities and
// programs that a plan does not give. What is refused works under a plan that gives it.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <netinet/in.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <filesystem>
#include <fstream>

#include "host/enforce/features.h"
#include "host/enforce/kernel.h"
#include "launch.h"

namespace EnforceTest {
namespace {

using testing::StrEq;

// Some tests are about what only root has.
class Entry : public testing::TestWithParam<User> {
 protected:
  void SetUp() override {
    if (!CanBe(user)) GTEST_SKIP() << "only root can start somebody as root";
    if (Lacks()) GTEST_SKIP() << Lacks();
  }

  const User user = GetParam();
  const Tree tree{CanBe(GetParam()) ? GetParam() : User::kNobody};
};

INSTANTIATE_TEST_SUITE_P(Users, Entry, testing::Values(User::kRoot, User::kNobody),
                         [](const auto& tested) { return NameOf(tested.param); });

// ---- Descriptors

class OpenDescriptor {
 public:
  explicit OpenDescriptor(int opened) : number(opened) {}
  OpenDescriptor(const OpenDescriptor&) = delete;
  OpenDescriptor& operator=(const OpenDescriptor&) = delete;
  ~OpenDescriptor() { close(number); }
  int Number() const { return number; }
  std::string Text() const { return std::to_string(number); }

 private:
  int number;
};

TEST_P(Entry, ClosesWhatWasOpen) {
  const OpenDescriptor first(open(tree.Path().c_str(), O_PATH | O_CLOEXEC));
  const OpenDescriptor second(dup(first.Number()));
  const OpenDescriptor third(dup(first.Number()));
  const OpenDescriptor far(fcntl(first.Number(), F_DUPFD, 700));
  Launch launch{user, {"--plan", WritePlan(tree, PlanOf(tree))}, {ProbePath()}};
  for (const OpenDescriptor* descriptor : {&first, &second, &third, &far}) {
    launch.descriptors.push_back(descriptor->Number());
    launch.command.push_back("is-open=" + descriptor->Text());
  }
  const auto lines = [&](const char* firstIs, const char* secondIs, const char* thirdIs,
                         const char* farIs) {
    return launch.command[1] + " " + firstIs + "\n" + launch.command[2] + " " + secondIs + "\n" +
           launch.command[3] + " " + thirdIs + "\n" + launch.command[4] + " " + farIs + "\n";
  };

  EXPECT_THAT(RunLauncher(launch).output, StrEq(lines("EBADF", "EBADF", "EBADF", "EBADF")));

  launch.options.insert(launch.options.end(), {"--keep-fd", second.Text()});
  EXPECT_THAT(RunLauncher(launch).output, StrEq(lines("EBADF", "ok", "EBADF", "EBADF")));

  launch.options.insert(launch.options.end(), {"--keep-fd", far.Text(), "--keep-fd", second.Text(),
                                               "--keep-fd", first.Text()});
  EXPECT_THAT(RunLauncher(launch).output, StrEq(lines("ok", "ok", "EBADF", "ok")));

  launch.options.insert(launch.options.end(), {"--keep-fd", third.Text(), "--keep-fd", "0"});
  EXPECT_THAT(RunLauncher(launch).output, StrEq(lines("ok", "ok", "ok", "ok")));
}

TEST_P(Entry, LeavesNoneOfItsOwn) {
  Enforce::Plan plan = PlanOf(tree);
  plan.filter = FilterWithout({});
  plan.paths.push_back({tree / "kept", AllRights()});
  if (Enforce::ProbeMounts() != Enforce::Namespace::kNone) {
    plan.masks = {{tree / "open", Enforce::MaskKind::kNoExec}};
  }
  Launch launch{user, {"--plan", WritePlan(tree, plan)}, {ProbePath()}};
  std::string expected;
  for (int number = 3; number < 20; ++number) {
    launch.command.push_back("is-open=" + std::to_string(number));
    expected += launch.command.back() + " EBADF\n";
  }
  EXPECT_THAT(RunLauncher(launch).output, StrEq(expected));
}

// ---- System calls

struct Call {
  const char* operation;
  std::vector<int> calls;
  bool needsRoot = false;
};

TEST_P(Entry, RefusesCalls) {
  const std::vector<Call> calls = {
      {"chmod=@/kept/file", {SYS_chmod, SYS_fchmodat}},
      {"chown=@/kept/file", {SYS_chown, SYS_fchownat}},
      {"utime=@/kept/file", {SYS_utimensat}},
      {"setxattr=@/kept/file,security.bpf.zorvan", {SYS_setxattr}, true},
      {"open-by-handle=@/kept/file,@", {SYS_open_by_handle_at}, true},
      {"setns", {SYS_setns}, true},
      {"unshare-user", {SYS_unshare}},
      {"setuid=65534", {SYS_setresuid}},
      {"run-from-memory=@/kept/program", {SYS_memfd_create}},
  };
  for (const Call& call : calls) {
    if (call.needsRoot && user != User::kRoot) continue;
    Enforce::Plan plan = PlanOf(tree);
    plan.filter = FilterWithout(call.calls);
    EXPECT_THAT(AnswerOf(user, tree, plan, call.operation), StrEq("EPERM")) << call.operation;
    plan.filter = FilterWithout({});
    EXPECT_THAT(AnswerOf(user, tree, plan, call.operation), StrEq("ok")) << call.operation;
  }
}

TEST_P(Entry, RefusesACallByItsNumber) {
  const std::string operation = "call=" + std::to_string(SYS_getppid);
  Enforce::Plan plan = PlanOf(tree);
  plan.filter = FilterWithout({SYS_getppid});
  EXPECT_THAT(AnswerOf(user, tree, plan, operation), StrEq("EPERM"));
  plan.filter = FilterWithout({SYS_getpid});
  EXPECT_THAT(AnswerOf(user, tree, plan, operation), StrEq("ok"));
}

#ifdef __x86_64__
// A kernel without the other tables refuses their calls in a way of its own.
TEST_P(Entry, KillsWhoCallsByAnotherTable) {
  for (const char* const operation : {"call-x32", "call-int80"}) {
    Enforce::Plan plan = PlanOf(tree);
    const int status = Probe(user, tree, plan, {operation}).status;
    EXPECT_FALSE(WIFSIGNALED(status) && WTERMSIG(status) == SIGSYS) << operation;
    plan.filter = FilterWithout({});
    const int filtered = Probe(user, tree, plan, {operation}).status;
    EXPECT_TRUE(WIFSIGNALED(filtered)) << operation;
    EXPECT_EQ(WTERMSIG(filtered), SIGSYS) << operation;
  }
}
#endif

// ---- Signals and sockets of others

// A process of the user that waits for signals.
class Victim {
 public:
  explicit Victim(User user) {
    std::array<int, 2> channel{};
    EXPECT_EQ(pipe2(channel.data(), O_CLOEXEC), 0);
    process = fork();
    if (process == 0) {
      if (Become(user) && write(channel[1], "x", 1) == 1) pause();
      _exit(1);
    }
    close(channel[1]);
    char ready = 0;
    EXPECT_EQ(read(channel[0], &ready, 1), 1) << "before, it is not the user's";
    close(channel[0]);
  }
  Victim(const Victim&) = delete;
  Victim& operator=(const Victim&) = delete;
  ~Victim() { End(); }

  std::string Text() const { return std::to_string(process); }

  // Ends it, and returns the signal that it died of: SIGTERM, or one that came before.
  int End() {
    if (isEnded) return 0;
    isEnded = true;
    int status = 0;
    kill(process, SIGTERM);
    waitpid(process, &status, 0);
    return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
  }

 private:
  pid_t process = -1;
  bool isEnded = false;
};

bool HasScopes() { return Enforce::Kernel::LandlockVersion() >= Enforce::Kernel::kScopesVersion; }

TEST_P(Entry, RefusesSignalsToOthers) {
  if (!HasScopes()) GTEST_SKIP() << "this version of Landlock knows nothing of signals";
  const Victim victim(user);
  for (const char* const way : {"kill=", "tgkill=", "sigqueue=", "pidfd="}) {
    Enforce::Plan plan = PlanOf(tree);
    plan.isScoped = true;
    EXPECT_THAT(AnswerOf(user, tree, plan, way + victim.Text()), StrEq("EPERM")) << way;
    plan.isScoped = false;
    EXPECT_THAT(AnswerOf(user, tree, plan, way + victim.Text()), StrEq("ok")) << way;
  }
}

TEST_P(Entry, LetsInputSignalNobodyElse) {
  if (!HasScopes()) GTEST_SKIP() << "this version of Landlock knows nothing of signals";
  Enforce::Plan plan = PlanOf(tree);
  plan.isScoped = true;
  Victim kept(user);
  static_cast<void>(Probe(user, tree, plan, {"input-signal=" + kept.Text()}));
  EXPECT_EQ(kept.End(), SIGTERM);

  plan.isScoped = false;
  Victim lost(user);
  EXPECT_THAT(AnswerOf(user, tree, plan, "input-signal=" + lost.Text()), StrEq("ok"));
  EXPECT_EQ(lost.End(), SIGUSR1);
}

TEST_P(Entry, RefusesAbstractSocketsOfOthers) {
  if (!HasScopes()) GTEST_SKIP() << "this version of Landlock knows nothing of abstract sockets";
  const OpenDescriptor socketHere(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const std::string name = "secpolicy-test-" + std::to_string(getpid());
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  std::memcpy(address.sun_path + 1, name.data(), name.size());
  const auto size = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + 1 + name.size());
  ASSERT_EQ(bind(socketHere.Number(), reinterpret_cast<const sockaddr*>(&address), size), 0);
  ASSERT_EQ(listen(socketHere.Number(), 4), 0);

  Enforce::Plan plan = PlanOf(tree);
  plan.isScoped = true;
  EXPECT_THAT(AnswerOf(user, tree, plan, "connect-abstract=" + name), StrEq("EPERM"));
  plan.isScoped = false;
  EXPECT_THAT(AnswerOf(user, tree, plan, "connect-abstract=" + name), StrEq("ok"));
}

// ---- Ports

// A socket of TCP with a port that the kernel chose.
class Listener {
 public:
  Listener() : here(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address = {};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof(address);
    auto* const any = reinterpret_cast<sockaddr*>(&address);
    EXPECT_EQ(bind(here.Number(), any, size), 0);
    EXPECT_EQ(listen(here.Number(), 8), 0);
    EXPECT_EQ(getsockname(here.Number(), any, &size), 0);
    port = ntohs(address.sin_port);
  }
  std::uint16_t Port() const { return port; }

 private:
  OpenDescriptor here;
  std::uint16_t port = 0;
};

bool HasPorts() { return Enforce::Kernel::LandlockVersion() >= Enforce::Kernel::kPortsVersion; }

TEST_P(Entry, RefusesPorts) {
  if (!HasPorts()) GTEST_SKIP() << "this version of Landlock knows nothing of ports";
  const Listener listener;
  const auto other = static_cast<std::uint16_t>(listener.Port() ^ 1);
  const std::string connect = "connect-tcp=" + std::to_string(listener.Port());
  const std::string bind = "bind-tcp=" + std::to_string(listener.Port());

  Enforce::Plan plan = PlanOf(tree);
  plan.connectsChecked = true;
  plan.connectPorts = {other};
  EXPECT_THAT(AnswerOf(user, tree, plan, connect), StrEq("EACCES"));
  EXPECT_THAT(AnswerOf(user, tree, plan, bind), StrEq("EADDRINUSE"));
  plan.connectPorts = {other, listener.Port()};
  EXPECT_THAT(AnswerOf(user, tree, plan, connect), StrEq("ok"));

  plan = PlanOf(tree);
  plan.bindsChecked = true;
  plan.bindPorts = {other};
  EXPECT_THAT(AnswerOf(user, tree, plan, bind), StrEq("EACCES"));
  EXPECT_THAT(AnswerOf(user, tree, plan, connect), StrEq("ok"));
  plan.bindPorts = {other, listener.Port()};
  EXPECT_THAT(AnswerOf(user, tree, plan, bind), StrEq("EADDRINUSE"));
}

// ---- Capabilities and identities

constexpr int kDacOverride = 1;

TEST(Capabilities, AreGoneForGood) {
  if (!CanBe(User::kRoot)) GTEST_SKIP() << "only root has capabilities";
  if (Lacks()) GTEST_SKIP() << Lacks();
  const Tree tree(User::kRoot);
  Enforce::Plan plan = PlanOf(tree);
  const std::string again = "run=" + ProbePath() + ",has-capability=1";
  for (const int number : {kDacOverride, Enforce::ProbeFeatures().lastCapability}) {
    for (const char* const operation :
         {"has-capability=", "has-bounding=", "raise-capability=", "raise-ambient="}) {
      const std::string whole = operation + std::to_string(number);
      plan.capabilities = ~(std::uint64_t{1} << number);
      EXPECT_THAT(AnswerOf(User::kRoot, tree, plan, whole), StrEq("EPERM")) << whole;
      plan.capabilities = ~std::uint64_t{0};
      EXPECT_THAT(AnswerOf(User::kRoot, tree, plan, whole), StrEq("ok")) << whole;
    }
  }
  plan.capabilities = 0;
  EXPECT_THAT(Probe(User::kRoot, tree, plan, {again}).output,
              StrEq("has-capability=1 EPERM\n" + again + " ok\n"));
  plan.capabilities = std::uint64_t{1} << kDacOverride;
  EXPECT_THAT(Probe(User::kRoot, tree, plan, {again}).output,
              StrEq("has-capability=1 ok\n" + again + " ok\n"));
}

TEST_P(Entry, StartsNothingWithCapabilitiesThatItCannotRead) {
  const std::string plan = WritePlan(tree, PlanOf(tree));
  WithoutCalls({SYS_capget}, [&] {
    const Outcome outcome = RunLauncher({user, {"--plan", plan}, {ProbePath()}});
    EXPECT_EQ(WEXITSTATUS(outcome.status), 126);
    EXPECT_THAT(outcome.errors,
                StrEq("secpolicy-run: cannot give up capabilities: Operation not permitted\n"));
  });
}

TEST(Capabilities, StayWithAnotherUser) {
  if (!CanBe(User::kRoot)) GTEST_SKIP() << "only root has capabilities";
  if (Lacks()) GTEST_SKIP() << Lacks();
  const Tree tree(User::kRoot);
  const Enforce::Plan plan = PlanOf(tree);
  EXPECT_THAT(Probe(User::kRoot, tree, plan, {"setuid=65534", "has-capability=1"}).output,
              StrEq("setuid=65534 ok\nhas-capability=1 ok\n"));
}

// Bits with which the superuser would have them again.
TEST(Capabilities, DoNotComeBackByTheUser) {
  if (!CanBe(User::kRoot)) GTEST_SKIP() << "only root has capabilities";
  if (Lacks()) GTEST_SKIP() << Lacks();
  const Tree tree(User::kRoot);
  Enforce::Plan plan = PlanOf(tree);
  // That root is nobody special on execution, and stays so with another identity; see
  // capabilities(7).
  for (const char* const operation :
       {"flip-securebit=0", "flip-securebit=2", "keep-capabilities"}) {
    plan.level = Policy::Level::kEnforcing;
    EXPECT_THAT(AnswerOf(User::kRoot, tree, plan, operation), StrEq("EPERM")) << operation;
    plan.level = Policy::Level::kDisabled;
    EXPECT_THAT(AnswerOf(User::kRoot, tree, plan, operation), StrEq("ok")) << operation;
  }
}

TEST(Capabilities, AreNotNeededByAnotherOwner) {
  if (!CanBe(User::kRoot)) GTEST_SKIP() << "only root can be kept from the files of others";
  if (Lacks()) GTEST_SKIP() << Lacks();
  const Tree tree(User::kNobody);
  std::filesystem::permissions(tree / "kept/file", std::filesystem::perms(0600));
  Enforce::Plan plan = PlanOf(tree);
  plan.capabilities = 0;
  EXPECT_THAT(AnswerOf(User::kRoot, tree, plan, "read=@/kept/file"), StrEq("EACCES"));
  plan.capabilities = std::uint64_t{1} << kDacOverride;
  EXPECT_THAT(AnswerOf(User::kRoot, tree, plan, "read=@/kept/file"), StrEq("ok"));
}

TEST(Capabilities, AreNotToBeHadFromAProgram) {
  if (!CanBe(User::kRoot)) GTEST_SKIP() << "only root can make such a program";
  if (Lacks()) GTEST_SKIP() << Lacks();
  const Tree tree(User::kRoot);
  ASSERT_EQ(chmod((tree / "kept/program").c_str(), 04755), 0);
  Enforce::Plan plan = PlanOf(tree);
  const std::string operation = tree.Resolve("run=@/kept/program,is-superuser");
  EXPECT_THAT(Probe(User::kNobody, tree, plan, {operation}).output,
              StrEq("is-superuser EPERM\n" + operation + " ok\n"));
  plan.level = Policy::Level::kPermissive;
  EXPECT_THAT(Probe(User::kNobody, tree, plan, {operation}).output,
              StrEq("is-superuser ok\n" + operation + " ok\n"));
}

// ---- Programs

TEST_P(Entry, StartsOneProgramAndNoSecond) {
  for (const char* const operation :
       {"run=@/kept/program", "run-by-secret=@/kept/program,0", "run-by-secret=@/kept/program,1",
        "run-by-secret=@/kept/program,0xffffffffffffffff", "run-by-descriptor=@/kept/program",
        "run-from-memory=@/kept/program"}) {
    Enforce::Plan plan = PlanOf(tree);
    AddSecretFilter(&plan);
    EXPECT_THAT(AnswerOf(user, tree, plan, operation), StrEq("EPERM")) << operation;
    plan.filter = FilterWithout({});
    plan.secret.reset();
    EXPECT_THAT(AnswerOf(user, tree, plan, operation), StrEq("ok")) << operation;
  }
}

// As a program does that guesses right.
TEST_P(Entry, LetsASecretPass) {
  Enforce::Plan plan = PlanOf(tree);
  AddSecretFilter(&plan);
  const std::string operation = "run-by-secret=@/kept/program,";
  EXPECT_THAT(AnswerOf(user, tree, plan, operation + std::to_string(kKnownSecret)), StrEq("ok"));
  EXPECT_THAT(AnswerOf(user, tree, plan, operation + std::to_string(kKnownSecret + 1)),
              StrEq("EPERM"));
}

TEST_P(Entry, StartsWhatTheDescriptorIs) {
  const std::string path = tree / "kept/program";
  const OpenDescriptor program(open(path.c_str(), O_PATH | O_CLOEXEC));
  std::filesystem::rename(tree / "kept/file", path);
  Launch launch{user,
                {"--plan", WritePlan(tree, PlanOf(tree)), "--program", program.Text()},
                {"any name", "is-open=" + program.Text()},
                {},
                {program.Number()}};
  // The file that is there now is no program.
  const Outcome outcome = RunLauncher(launch);
  EXPECT_THAT(outcome.errors, StrEq(""));
  EXPECT_THAT(outcome.output, StrEq(launch.command[1] + " EBADF\n"));
}

TEST_P(Entry, AsksTheRulesAboutADescriptor) {
  const std::string path = tree / "kept/program";
  const OpenDescriptor program(open(path.c_str(), O_PATH | O_CLOEXEC));
  const Launch launch{user,
                      {"--plan", WritePlan(tree, PlanOfNothing()), "--program", program.Text()},
                      {ProbePath()},
                      {},
                      {program.Number()}};
  EXPECT_THAT(RunLauncher(launch).errors, StrEq("secpolicy-run: cannot execute " + ProbePath() +
                                                " in the domain testDom: Permission denied\n"));
}

void WriteScript(const std::string& path, const std::string& interpreter) {
  std::ofstream(path) << "#!" << interpreter << "\n";
  std::filesystem::permissions(path, std::filesystem::perms(0755));
}

TEST_P(Entry, StartsScripts) {
  const std::string path = tree / "script";
  WriteScript(path, ProbePath() + " setns");
  Enforce::Plan plan = PlanOf(tree);
  AddSecretFilter(&plan);
  const std::string planFile = WritePlan(tree, plan);

  const Outcome byPath = RunLauncher({user, {"--plan", planFile}, {path}});
  EXPECT_THAT(byPath.errors, StrEq(""));
  EXPECT_THAT(byPath.output, testing::EndsWith("\n" + path + " is no operation\n"));

  const OpenDescriptor script(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  const Outcome byDescriptor = RunLauncher(
      {user, {"--plan", planFile, "--program", script.Text()}, {"name"}, {}, {script.Number()}});
  EXPECT_THAT(byDescriptor.errors, StrEq(""));
  EXPECT_THAT(byDescriptor.output,
              testing::EndsWith("\n/dev/fd/" + script.Text() + " is no operation\n"));
}

// ---- Levels, and what the caller brings along

TEST_P(Entry, ConfinesOnlyWhatIsEnforcing) {
  Enforce::Plan plan = PlanOfNothing();
  plan.capabilities = 0;
  plan.filter = FilterWithout({SYS_getppid});
  const std::string call = "call=" + std::to_string(SYS_getppid);
  for (const Policy::Level level : {Policy::Level::kPermissive, Policy::Level::kDisabled}) {
    plan.level = level;
    EXPECT_THAT(AnswerOf(user, tree, plan, "read=@/kept/file"), StrEq("ok"));
    EXPECT_THAT(AnswerOf(user, tree, plan, call), StrEq("ok"));
  }
  plan.level = Policy::Level::kEnforcing;
  EXPECT_THAT(AnswerOf(user, tree, plan, "read=@/kept/file"), StrEq("EACCES"));
  EXPECT_THAT(AnswerOf(user, tree, plan, call), StrEq("EPERM"));
}

// The library says so where it is loaded.
TEST_P(Entry, LoadsNothingOfItsCaller) {
  Enforce::Plan plan = PlanOf(tree);
  const std::string library = tree / "library.so";
  std::filesystem::copy_file(PRELOADED, library);
  Launch launch{user,
                {"--plan", WritePlan(tree, plan)},
                {ProbePath(), "variable=LD_PRELOAD"},
                {"LD_PRELOAD=" + library, "LD_AUDIT=" + library, "LD_LIBRARY_PATH=" + tree.Path(),
                 "GLIBC_TUNABLES=glibc.malloc.check=9"}};
  const Outcome confined = RunLauncher(launch);
  EXPECT_THAT(confined.errors, StrEq(""));
  EXPECT_THAT(confined.output, StrEq("variable=LD_PRELOAD ok\n"));

  // The control: it is the program's own affair then.
  plan.level = Policy::Level::kDisabled;
  launch.options = {"--plan", WritePlan(tree, plan)};
  launch.command = {"/bin/true"};
  launch.environment = {"LD_PRELOAD=" + library};
  EXPECT_THAT(RunLauncher(launch).errors, StrEq("loaded\n"));
}

// ---- Beside the module

TEST_P(Entry, StartsNothingThatTheModuleIsNotAskedFor) {
  Enforce::Plan plan = PlanOfNothing();
  plan.domain = "keptDom";
  const OpenDescriptor none(open("/dev/null", O_RDWR | O_CLOEXEC));
  for (const Policy::Level level : {Policy::Level::kEnforcing, Policy::Level::kDisabled}) {
    plan.level = level;
    const Outcome outcome = RunLauncher({user,
                                         {"--plan", WritePlan(tree, plan), "--module", none.Text()},
                                         {ProbePath(), "read=@/open/file"},
                                         {},
                                         {none.Number()}});
    EXPECT_EQ(WEXITSTATUS(outcome.status), 126);
    EXPECT_THAT(outcome.output, StrEq(""));
    EXPECT_THAT(
        outcome.errors,
        testing::StartsWith("secpolicy-run: cannot ask the module for the domain keptDom: "));
  }
}

TEST_P(Entry, AsksTheKernelByExecutingTheProgram) {
  const auto asks = [&](const std::string& broker) {
    return RunLauncher({user,
                        {"--ask"},
                        {ProbePath(), "variable=SECPOLICY_BROKER"},
                        {"SECPOLICY_BROKER=" + broker}});
  };
  EXPECT_THAT(asks("kernel").output, StrEq("variable=SECPOLICY_BROKER ok\n"));
  EXPECT_EQ(WEXITSTATUS(asks("kernels").status), 126);
}

}  // namespace
}  // namespace EnforceTest
