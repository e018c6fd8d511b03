#include "launch.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/audit.h>
#include <linux/seccomp.h>
#include <sched.h>
#include <sys/mman.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <system_error>

#include "host/enforce/kernel.h"
#include "host/enforce/plan_file.h"
#include "support/temporary_directory.h"

namespace EnforceTest {
namespace {

namespace fs = std::filesystem;

constexpr unsigned int kNobody = 65534;

void Check(bool holds, const std::string& what) {
  if (!holds) throw std::system_error(errno, std::generic_category(), what);
}

void CopyProgram(const std::string& from, const std::string& to) {
  fs::copy_file(from, to);
  fs::permissions(to, fs::perms(0755));
}

// The build may lie where other users have no way to.
class Tools {
 public:
  Tools() {
    fs::permissions(directory.Path(), fs::perms(0755));
    CopyProgram(LAUNCHER, directory / "secpolicy-run");
    CopyProgram(PROBE, directory / "probe");
  }
  const std::string& Path() const { return directory.Path(); }

 private:
  SecPolicyTest::TemporaryDirectory directory;
};

void WriteFile(const std::string& path, const std::string& content) {
  std::ofstream file(path, std::ios::binary);
  file << content;
  Check(file.flush().good(), path);
}

void GiveToNobody(const std::string& directory) {
  for (const auto& entry : fs::recursive_directory_iterator(directory)) {
    Check(lchown(entry.path().c_str(), kNobody, kNobody) == 0, entry.path());
  }
  Check(chown(directory.c_str(), kNobody, kNobody) == 0, directory);
}

std::vector<char*> PointersTo(const std::vector<std::string>& words) {
  std::vector<char*> pointers;
  for (const std::string& word : words) pointers.push_back(const_cast<char*>(word.c_str()));
  pointers.push_back(nullptr);
  return pointers;
}

// A file without a name that takes what a child process writes.
class Catch {
 public:
  Catch() : file(memfd_create("output", MFD_CLOEXEC)) { Check(file >= 0, "memfd_create"); }
  Catch(const Catch&) = delete;
  Catch& operator=(const Catch&) = delete;
  ~Catch() { close(file); }

  int Number() const { return file; }

  std::string Content() const {
    std::string content;
    std::array<char, 4096> block{};
    ssize_t size = 0;
    while ((size = pread(file, block.data(), block.size(), static_cast<off_t>(content.size()))) >
           0) {
      content.append(block.data(), static_cast<std::size_t>(size));
    }
    return content;
  }

 private:
  int file;
};

}  // namespace

bool Become(User user) {
  if (user == User::kRoot || geteuid() != 0) return true;
  return setresgid(kNobody, kNobody, kNobody) == 0 && syscall(SYS_setgroups, 0, nullptr) == 0 &&
         setresuid(kNobody, kNobody, kNobody) == 0;
}

const char* Lacks() {
  if (Enforce::Kernel::LandlockVersion() == 0) return "this kernel has no Landlock";
  if (!Enforce::Kernel::KnowsAnswer(SECCOMP_RET_ERRNO)) return "this kernel has no seccomp";
  return nullptr;
}

void InChild(const std::function<void()>& act) {
  std::fflush(stdout);
  const pid_t child = fork();
  Check(child >= 0, "fork");
  if (child == 0) {
    act();
    std::fflush(stdout);
    _exit(testing::Test::HasFailure() ? 1 : 0);
  }
  int status = -1;
  Check(waitpid(child, &status, 0) == child, "waitpid");
  EXPECT_EQ(status, 0) << "see above";
}

void InOwnMounts(const std::function<void()>& act) {
  InChild([&] {
    EXPECT_EQ(unshare(CLONE_NEWNS), 0);
    EXPECT_EQ(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), 0);
    act();
  });
}

void WithoutCalls(const std::vector<int>& calls, const std::function<void()>& act) {
  InChild([&] {
    std::vector<sock_filter> filter = FilterWithout(calls);
    EXPECT_EQ(prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0), 0);
    EXPECT_EQ(Enforce::Kernel::SetFilter(filter.data(), filter.size()), 0);
    act();
  });
}

std::string NameOf(User user) { return user == User::kRoot ? "AsRoot" : "AsNobody"; }

bool CanBe(User user) { return user == User::kNobody || geteuid() == 0; }

std::string ToolsDirectory() {
  static const Tools tools;
  return tools.Path();
}

std::string ProbePath() { return ToolsDirectory() + "/probe"; }

Tree::Tree(User owner) : path(fs::temp_directory_path() / "secpolicy-tree-XXXXXX") {
  Check(mkdtemp(path.data()) != nullptr, path);
  for (const char* directory : {"open", "open/directory", "kept", "kept/directory"}) {
    fs::create_directory(*this / directory);
  }
  WriteFile(*this / "open/file", "open\n");
  WriteFile(*this / "kept/file", "kept\n");
  CopyProgram(PROBE, *this / "kept/program");
  if (owner == User::kNobody && geteuid() == 0) GiveToNobody(path);
  fs::permissions(path, fs::perms(0755));
}

Tree::~Tree() {
  std::error_code ignored;
  fs::remove_all(path, ignored);
}

std::string Tree::Resolve(std::string text) const {
  for (std::size_t at = 0; (at = text.find('@', at)) != std::string::npos; at += path.size()) {
    text.replace(at, 1, path);
  }
  return text;
}

Outcome RunLauncher(const Launch& launch) {
  std::vector<std::string> arguments = {ToolsDirectory() + "/secpolicy-run"};
  arguments.insert(arguments.end(), launch.options.begin(), launch.options.end());
  arguments.emplace_back("--");
  arguments.insert(arguments.end(), launch.command.begin(), launch.command.end());
  std::vector<std::string> environment = {"PATH=/usr/bin:/bin"};
  environment.insert(environment.end(), launch.environment.begin(), launch.environment.end());
  const std::vector<char*> argv = PointersTo(arguments);
  const std::vector<char*> envp = PointersTo(environment);

  const Catch output;
  const Catch errors;
  const pid_t child = fork();
  Check(child >= 0, "fork");
  if (child == 0) {
    dup2(output.Number(), STDOUT_FILENO);
    dup2(errors.Number(), STDERR_FILENO);
    for (const int descriptor : launch.descriptors) fcntl(descriptor, F_SETFD, 0);
    if (Become(launch.user)) execve(argv[0], argv.data(), envp.data());
    _exit(125);
  }
  Outcome outcome;
  Check(waitpid(child, &outcome.status, 0) == child, "waitpid");
  outcome.output = output.Content();
  outcome.errors = errors.Content();
  return outcome;
}

std::string WritePlan(const Tree& tree, const Enforce::Plan& plan) {
  const std::string path = tree / "plan";
  WriteFile(path, Enforce::Serialize(plan));
  fs::permissions(path, fs::perms(0644));
  return path;
}

Outcome Probe(User user, const Tree& tree, const Enforce::Plan& plan,
              const std::vector<std::string>& operations) {
  Launch launch{user, {"--plan", WritePlan(tree, plan)}, {ProbePath()}};
  for (const std::string& operation : operations) launch.command.push_back(tree.Resolve(operation));
  return RunLauncher(launch);
}

std::string AnswerOf(User user, const Tree& tree, const Enforce::Plan& plan,
                     const std::string& operation) {
  const Outcome outcome = Probe(user, tree, plan, {operation});
  const std::string beginning = tree.Resolve(operation) + " ";
  const bool isAnswer = outcome.status == 0 && outcome.errors.empty() &&
                        outcome.output.starts_with(beginning) && outcome.output.ends_with('\n');
  if (!isAnswer) throw std::runtime_error("no answer: " + outcome.output + outcome.errors);
  return outcome.output.substr(beginning.size(), outcome.output.size() - beginning.size() - 1);
}

std::uint64_t AllRights() {
  return Enforce::Landlock::AllRights(Enforce::Kernel::LandlockVersion());
}

Enforce::Plan PlanOf(const Tree& tree) {
  Enforce::Plan plan = PlanOfNothing();
  plan.paths.push_back({tree.Path(), AllRights()});
  return plan;
}

Enforce::Plan PlanOfNothing() {
  namespace Landlock = Enforce::Landlock;
  Enforce::Plan plan;
  plan.domain = "testDom";
  plan.handledFiles = AllRights();
  plan.paths = {{ProbePath(), Landlock::kExecute | Landlock::kReadFile}};
  plan.capabilities = ~std::uint64_t{0};
  return plan;
}

namespace {

#if defined(__x86_64__)
constexpr std::uint32_t kArchitecture = AUDIT_ARCH_X86_64;
#elif defined(__aarch64__)
constexpr std::uint32_t kArchitecture = AUDIT_ARCH_AARCH64;
#endif

sock_filter Load(std::size_t offset) {
  return BPF_STMT(BPF_LD | BPF_W | BPF_ABS, static_cast<std::uint32_t>(offset));
}

sock_filter SkipUnless(std::uint32_t value, unsigned char count) {
  return BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, value, 0, count);
}

sock_filter Answer(std::uint32_t answer) { return BPF_STMT(BPF_RET | BPF_K, answer); }

// Ends with the number of the call loaded.
std::vector<sock_filter> KillOtherTables() {
  return {Load(offsetof(seccomp_data, arch)),
          BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, kArchitecture, 1, 0),
          Answer(SECCOMP_RET_KILL_PROCESS),
          Load(offsetof(seccomp_data, nr)),
          BPF_JUMP(BPF_JMP | BPF_JGE | BPF_K, 0x4000'0000, 0, 1),
          Answer(SECCOMP_RET_KILL_PROCESS)};
}

}  // namespace

std::vector<sock_filter> FilterWithout(const std::vector<int>& calls) {
  std::vector<sock_filter> filter = KillOtherTables();
  for (const int call : calls) {
    filter.push_back(SkipUnless(static_cast<std::uint32_t>(call), 1));
    filter.push_back(Answer(SECCOMP_RET_ERRNO | EPERM));
  }
  filter.push_back(Answer(SECCOMP_RET_ALLOW));
  return filter;
}

void AddSecretFilter(Enforce::Plan* plan) {
  plan->filter = KillOtherTables();
  plan->filter.insert(
      plan->filter.end(),
      {BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_execve, 1, 0), SkipUnless(SYS_execveat, 6),
       Load(offsetof(seccomp_data, args[5])),
       BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, kKnownSecret, 3, 0), SkipUnless(0, 4),
       Load(offsetof(seccomp_data, args[5]) + 4), SkipUnless(0, 2), Answer(SECCOMP_RET_ALLOW),
       Answer(SECCOMP_RET_ALLOW), Answer(SECCOMP_RET_ERRNO | EPERM)});
  const std::size_t size = plan->filter.size();
  plan->secret = {size - 6, size - 4};
}

}  // namespace EnforceTest
