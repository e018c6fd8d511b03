// Transitions on the kernel of a whole machine: hunts for a program that is executed in another
// domain than the rules say, and for a way to have the next domain do what the former one wants.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <sched.h>
#include <sys/auxv.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <map>
#include <optional>
#include <random>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "host/linux/files/inode_generation.h"
#include "policy/decision.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

namespace fs = std::filesystem;
using Policy::InstalledDomain;

const Enforce::LabelNumbers kLabels = {{"tool", 200}, {"gear", 201}, {"toy", 202}};
const std::string kPlace = "/tmp/programs";
constexpr unsigned int kFirst = 20;

std::string ProgramOf(const std::string& label) { return kPlace + "/" + label + "/cat"; }

void Label(const std::string& path, const std::string& label) {
  const std::uint32_t number = kLabels.at(label);
  ASSERT_EQ(lsetxattr(path.c_str(), "security.bpf.zorvan", &number, sizeof(number), 0), 0) << path;
}

// As one that came from a tardisk with this label.
Enforce::TardiskFile Brought(const std::string& path, const std::string& label) {
  struct stat status = {};
  EXPECT_EQ(stat(path.c_str(), &status), 0) << path;
  const auto generation = LinuxHost::GenerationOf(path.c_str());
  EXPECT_TRUE(generation) << path;
  return {.device = status.st_dev,
          .inode = status.st_ino,
          .generation = generation.value_or(0),
          .label = kLabels.at(label)};
}

void WriteScript(const std::string& path, const std::string& interpreter) {
  std::ofstream(path) << "#!" << interpreter << "\nread line\n";
  fs::permissions(path, fs::perms::owner_all);
}

// Executes a program that reads until it is told to end. What is told of the failure is its number.
using Execution = std::function<void(const std::string& path)>;

void Execute(const std::string& path) { execl(path.c_str(), "cat", nullptr); }

void ExecuteByDescriptor(const std::string& path) {
  const int program = open(path.c_str(), O_RDONLY);
  syscall(SYS_execveat, program, "", nullptr, nullptr, AT_EMPTY_PATH);
}

void ExecuteByThread(const std::string& path) {
  std::thread([&path] { Execute(path); }).join();
}

void ExecuteWithoutNewPrivileges(const std::string& path) {
  prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0);
  Execute(path);
}

void ExecuteAsUser(const std::string& path) {
  if (BecomeUser() != 0) _exit(99);
  Execute(path);
}

void ExecuteInUserNamespace(const std::string& path) {
  if (unshare(CLONE_NEWUSER) != 0) _exit(99);
  Execute(path);
}

// Until it is killed. What it has open would hide that the other one has executed its program.
[[noreturn]] void Stay() {
  close_range(3, ~0U, 0);
  for (;;) pause();
}

void ExecuteWithSharedDirectories(const std::string& path) {
  if (syscall(SYS_clone, CLONE_FS | SIGCHLD, 0, 0, 0, 0) == 0) Stay();
  Execute(path);
}

// Somebody in the same domain traces it, as others may not.
void ExecuteTraced(const std::string& path) {
  const pid_t traced = getpid();
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) _exit(99);
  prctl(PR_SET_PTRACER, PR_SET_PTRACER_ANY, 0, 0, 0);
  if (fork() == 0) {
    if (ptrace(PTRACE_SEIZE, traced, 0, 0) != 0 || write(ends[1], "", 1) != 1) _exit(99);
    Stay();
  }
  char word = 0;
  if (read(ends[0], &word, 1) != 1) _exit(99);
  Execute(path);
}

struct Outcome {
  int error = 0;
  std::optional<unsigned int> domain = {};  // where it was executed
  bool isSecure = false;

  bool operator==(const Outcome&) const = default;
};

Outcome Refused() { return {.error = EPERM}; }

// A process that waits until it is placed, and then executes a program in a group of its own.
class Executor {
 public:
  Executor(const std::string& path, const Execution& execute) {
    EXPECT_EQ(pipe2(input, 0), 0);
    EXPECT_EQ(pipe2(failure, O_CLOEXEC), 0);
    process = fork();
    if (process == 0) Run(path, execute);
    close(input[0]);
    close(failure[1]);
    waitpid(process, nullptr, WUNTRACED);
  }
  ~Executor() {
    close(input[1]);
    close(failure[0]);
    kill(-process, SIGKILL);
    waitpid(process, nullptr, 0);
  }
  Executor(const Executor&) = delete;
  Executor& operator=(const Executor&) = delete;

  pid_t Process() const { return process; }

  // Goes on until the program runs, or cannot.
  int Go() const {
    kill(process, SIGCONT);
    int error = 0;
    return read(failure[0], &error, sizeof(error)) == sizeof(error) ? error : 0;
  }

  // The kernel writes it a moment after what is closed then was closed.
  bool IsSecure() const {
    for (int turn = 0; turn < 2000; ++turn) {
      if (const auto found = FindSecure()) return *found;
      usleep(1000);
    }
    ADD_FAILURE() << "AT_SECURE is missing";
    return false;
  }

 private:
  std::optional<bool> FindSecure() const {
    std::ifstream file("/proc/" + std::to_string(process) + "/auxv", std::ios::binary);
    unsigned long entry[2] = {};
    while (file.read(reinterpret_cast<char*>(entry), sizeof(entry))) {
      if (entry[0] == AT_SECURE) return entry[1] != 0;
    }
    return std::nullopt;
  }

  [[noreturn]] void Run(const std::string& path, const Execution& execute) const {
    setpgid(0, 0);
    dup2(input[0], STDIN_FILENO);
    close(input[1]);
    raise(SIGSTOP);
    execute(path);
    const int error = errno;
    if (write(failure[1], &error, sizeof(error)) != sizeof(error)) _exit(99);
    _exit(0);
  }

  int input[2] = {};
  int failure[2] = {};
  pid_t process = -1;
};

class ModuleExecutionTest : public ModuleTest {
 protected:
  void SetUp() override {
    ModuleTest::SetUp();
    if (IsSkipped()) return;
    fs::remove_all(kPlace);
    for (const auto& [label, number] : kLabels) {
      fs::create_directories(kPlace + "/" + label);
      Label(kPlace + "/" + label, label);
      fs::copy_file("/bin/busybox", ProgramOf(label));
    }
    WriteScript(kPlace + "/tool/script", "/bin/busybox sh");
    module->LearnLabels();
    module->TellTardiskFiles({});
  }

  // Domains from kFirst on with these names and rules, beside which they may all but use
  // capabilities.
  static std::vector<InstalledDomain> Domains(
      const std::vector<std::pair<std::string, std::vector<std::string>>>& policies) {
    std::vector<InstalledDomain> domains;
    for (const auto& [name, rules] : policies) {
      InstalledDomain domain = Numbered(rules);
      domain.name = name;
      domain.id = kFirst + static_cast<unsigned int>(domains.size());
      domains.push_back(std::move(domain));
    }
    return domains;
  }

  void Publish(const std::vector<InstalledDomain>& domains) {
    module->Publish(PlanModule(domains, CAP_LAST_CAP, kLabels), 2);
  }

  // From the first domain the label "tool" leads to the second one.
  void PublishTwo() {
    Publish(Domains({{"one", {"-d tool two exec grant", "-d gear one exec grant"}}, {"two", {}}}));
  }

  // Without whether it is secure, which is not to be told of what its domain has ended since.
  Outcome Start(unsigned int domain, const Executor& executor) {
    module->Place(executor.Process(), domain);
    if (const int error = executor.Go()) return {.error = error};
    return {.domain = module->DomainOf(executor.Process())};
  }

  Outcome From(unsigned int domain, const std::string& path, const Execution& execute = Execute) {
    const Executor executor(path, execute);
    Outcome outcome = Start(domain, executor);
    outcome.isSecure = outcome.error == 0 && executor.IsSecure();
    return outcome;
  }

  void ExpectToEnter(const std::string& path, const Execution& execute = Execute) {
    EXPECT_EQ(From(kFirst, path, execute), Outcome({.domain = kFirst + 1, .isSecure = true}));
  }
  void ExpectToStay(const std::string& path, const Execution& execute = Execute) {
    EXPECT_EQ(From(kFirst, path, execute), Outcome({.domain = kFirst}));
  }
  void ExpectToFail(const std::string& path, const Execution& execute = Execute) {
    EXPECT_EQ(From(kFirst, path, execute), Refused());
  }
};

void PrintTo(const Outcome& outcome, std::ostream* stream) {
  *stream << "error " << outcome.error << ", domain " << outcome.domain.value_or(9999)
          << (outcome.isSecure ? ", secure" : "");
}

TEST_F(ModuleExecutionTest, EntersTheDomainThatTheLabelLeadsTo) {
  PublishTwo();
  ExpectToEnter(ProgramOf("tool"));
  ExpectToStay(ProgramOf("gear"));
  ExpectToStay(ProgramOf("toy"));
  ExpectToStay("/bin/busybox");
  EXPECT_EQ(From(kFirst + 1, ProgramOf("tool")), Outcome({.domain = kFirst + 1}));
}

TEST_F(ModuleExecutionTest, WidensAndNarrowsWhatAProcessMayDo) {
  const auto rules =
      Domains({{"one", {"-d tool two exec grant"}}, {"two", {"-d gear one exec grant"}}});
  for (const auto& [from, label, inside, outside] :
       {std::tuple{kFirst, "tool", 0, EPERM}, {kFirst + 1, "gear", 1, 0}}) {
    ModulePlan plan = PlanModule(rules, CAP_LAST_CAP, kLabels);
    plan[1].rules.capabilities = kAll;
    module->Publish(plan, 2);
    const std::string path = kPlace + "/" + label + "/chroot";
    fs::copy_file("/bin/busybox", path);
    EXPECT_EQ(In(from, ChangeRoot), outside);
    EXPECT_EQ(In(from,
                 [&path] {
                   return InChild([&path] {
                     execl(path.c_str(), "chroot", "/", "/bin/busybox", "true", nullptr);
                     return 100 + errno;
                   });
                 }),
              inside);
  }
}

// Labels are not read with the rights of who executes.
TEST_F(ModuleExecutionTest, EntersByAProgramThatMayNotBeRead) {
  ModulePlan plan = PlanModule(Domains({{"one", {"-d tool two exec grant"}}, {"two", {}}}),
                               CAP_LAST_CAP, kLabels);
  plan[0].rules.capabilities = kAll;
  module->Publish(plan, 2);
  for (const char* const label : {"tool", "toy"})
    fs::permissions(ProgramOf(label), fs::perms(0711), fs::perm_options::replace);
  ExpectToEnter(ProgramOf("tool"), ExecuteAsUser);
  ExpectToStay(ProgramOf("toy"), ExecuteAsUser);
}

TEST_F(ModuleExecutionTest, EntersFromAnyThreadAndByDescriptors) {
  PublishTwo();
  ExpectToEnter(ProgramOf("tool"), ExecuteByThread);
  ExpectToEnter(ProgramOf("tool"), ExecuteByDescriptor);
  ExpectToStay(ProgramOf("toy"), ExecuteByThread);
  ExpectToStay(ProgramOf("toy"), ExecuteByDescriptor);
}

TEST_F(ModuleExecutionTest, LeavesTheParentOfAVforkWhereItIs) {
  PublishTwo();
  const std::string path = ProgramOf("tool");
  EXPECT_EQ(In(kFirst,
               [&path] {
                 const pid_t child = vfork();
                 if (child == 0) {
                   execl(path.c_str(), "cat", "/dev/null", nullptr);
                   _exit(100 + errno);
                 }
                 return ResultOf(child) != 0 ? 99 : ChangeRoot();
               }),
            EPERM);
}

// ---- Who would have the next domain do what he wants

TEST_F(ModuleExecutionTest, RefusesWhoIsTraced) {
  PublishTwo();
  ExpectToFail(ProgramOf("tool"), ExecuteTraced);
  ExpectToStay(ProgramOf("toy"), ExecuteTraced);
}

TEST_F(ModuleExecutionTest, RefusesWhoSharesItsDirectories) {
  PublishTwo();
  ExpectToFail(ProgramOf("tool"), ExecuteWithSharedDirectories);
  ExpectToStay(ProgramOf("toy"), ExecuteWithSharedDirectories);
}

TEST_F(ModuleExecutionTest, RefusesWhoMayGetNoMorePrivileges) {
  PublishTwo();
  ExpectToFail(ProgramOf("tool"), ExecuteWithoutNewPrivileges);
  ExpectToStay(ProgramOf("toy"), ExecuteWithoutNewPrivileges);
}

TEST_F(ModuleExecutionTest, RefusesWhoIsInAUserNamespace) {
  PublishTwo();
  ExpectToFail(ProgramOf("tool"), ExecuteInUserNamespace);
  ExpectToStay(ProgramOf("toy"), ExecuteInUserNamespace);
}

TEST_F(ModuleExecutionTest, RefusesWhatIsMountedWithoutPrivileges) {
  PublishTwo();
  const std::string place = "/tmp/unprivileged";
  fs::create_directories(place);
  ASSERT_EQ(mount(kPlace.c_str(), place.c_str(), nullptr, MS_BIND, nullptr), 0);
  ExpectToEnter(place + "/tool/cat");
  ASSERT_EQ(mount(nullptr, place.c_str(), nullptr, MS_BIND | MS_REMOUNT | MS_NOSUID, nullptr), 0);
  ExpectToFail(place + "/tool/cat");
  ExpectToStay(place + "/toy/cat");
  EXPECT_EQ(umount2(place.c_str(), MNT_DETACH), 0);
}

// ---- Scripts

TEST_F(ModuleExecutionTest, EntersByAScriptThatIsExecutedByItsPath) {
  PublishTwo();
  ExpectToEnter(kPlace + "/tool/script");
  fs::create_symlink(kPlace + "/tool/script", kPlace + "/link");
  fs::create_symlink(ProgramOf("tool"), kPlace + "/program");
  ExpectToFail(kPlace + "/link");
  ExpectToFail(kPlace + "/toy/../tool/script");
  ExpectToFail(kPlace + "/tool/script", ExecuteByDescriptor);
  ExpectToEnter(kPlace + "/program");
}

TEST_F(ModuleExecutionTest, StaysWithTheLabelsOfInterpreters) {
  PublishTwo();
  WriteScript(kPlace + "/toy/script", ProgramOf("tool"));
  ExpectToStay(kPlace + "/toy/script");
}

// The interpreter is the next domain's to execute, and the program as well.
TEST_F(ModuleExecutionTest, LeavesTheRestToTheNextDomain) {
  auto domains = Domains({{"one", {"-d tool two exec grant"}}, {"two", {}}});
  domains[0].rules.push_back(RuleOf("-r /usr/bin r"));
  Publish(domains);
  ExpectToEnter(kPlace + "/tool/script");
  EXPECT_EQ(From(kFirst, kPlace + "/toy/../../../bin/busybox"), Refused());
  domains[1].rules.push_back(RuleOf("-r /usr/bin r"));
  Publish(domains);
  ExpectToFail(kPlace + "/tool/script");
}

TEST_F(ModuleExecutionTest, StaysWhenTheExecutionFails) {
  PublishTwo();
  WriteScript(kPlace + "/tool/broken", "/tmp/missing");
  const std::string broken = kPlace + "/tool/broken";
  const auto fail = [&broken](const std::string& path) {
    Execute(broken);
    if (errno == ENOENT) Execute(path);
  };
  ExpectToStay(ProgramOf("toy"), fail);
  ExpectToEnter(ProgramOf("tool"), fail);
}

// ---- Rules and levels

TEST_F(ModuleExecutionTest, RefusesADomainThatThereIsNot) {
  Publish(Domains({{"one", {"-d tool two exec grant"}}}));
  ExpectToFail(ProgramOf("tool"));
  PublishTwo();
  ExpectToEnter(ProgramOf("tool"));
  Publish(Domains({{"one", {"-d tool two exec grant"}}}));
  ExpectToFail(ProgramOf("tool"));
}

TEST_F(ModuleExecutionTest, RefusesWhatMayNotBeExecuted) {
  Publish(Domains({{"one", {"-d tool two exec grant", "-a tool execute revoke"}}, {"two", {}}}));
  ExpectToFail(ProgramOf("tool"));
  PublishTwo();
  ExpectToEnter(ProgramOf("tool"));
}

TEST_F(ModuleExecutionTest, EntersWhateverTheLevelIs) {
  PublishTwo();
  for (const Level level : {Level::kPermissive, Level::kDisabled}) {
    module->SetLevel(kFirst, level);
    ExpectToEnter(ProgramOf("tool"));
    // Whoever controls it does not get there, but goes on.
    ExpectToStay(ProgramOf("tool"), ExecuteTraced);
    module->SetLevel(kFirst, Level::kEnforcing);
    module->SetLevel(kFirst + 1, level);
    ExpectToEnter(ProgramOf("tool"));
    module->SetLevel(kFirst + 1, Level::kEnforcing);
  }
}

void ExecuteFromMemory(const std::string& path) {
  const int program = static_cast<int>(syscall(SYS_memfd_create, "", 0));
  const int file = open(path.c_str(), O_RDONLY);
  char buffer[1 << 16];
  for (ssize_t size = 0; (size = read(file, buffer, sizeof(buffer))) > 0;)
    if (write(program, buffer, static_cast<std::size_t>(size)) != size) _exit(99);
  const char* const arguments[] = {"cat", nullptr};
  syscall(SYS_execveat, program, "", arguments, nullptr, AT_EMPTY_PATH);
}

TEST_F(ModuleExecutionTest, RefusesProgramsThatLieNowhere) {
  PublishTwo();
  ExpectToFail(ProgramOf("toy"), ExecuteFromMemory);
  const Executor outside(ProgramOf("toy"), ExecuteFromMemory);
  EXPECT_EQ(outside.Go(), 0);
}

// ---- Tardisks

// Of three domains the first one leads to the second by tardisks with the label "gear".
class ModuleTardiskTest : public ModuleExecutionTest {
 protected:
  void PublishThree(std::vector<std::string> more = {}) {
    more.emplace_back("-d gear two tardisk_exec grant");
    Publish(Domains({{"one", more}, {"two", {}}, {"three", {}}}));
  }

  // The program with the label "toy" came from a tardisk with this one.
  void Bring(const std::string& label) { module->TellTardiskFiles({Brought(toy, label)}); }

  const std::string toy = ProgramOf("toy");
};

TEST_F(ModuleTardiskTest, EntersTheDomainThatTheTardiskLeadsTo) {
  PublishThree();
  Bring("gear");
  ExpectToEnter(toy);
  ExpectToStay(ProgramOf("tool"));
  EXPECT_EQ(From(kFirst + 1, toy), Outcome({.domain = kFirst + 1}));
}

TEST_F(ModuleTardiskTest, KeepsLabelsOfProgramsAndOfTardisksApart) {
  PublishThree();
  Bring("tool");
  ExpectToStay(toy);
  ExpectToStay(ProgramOf("gear"));
  Publish(Domains({{"one", {"-d gear two exec grant"}}, {"two", {}}}));
  Bring("gear");
  ExpectToStay(toy);
  ExpectToEnter(ProgramOf("gear"));
}

TEST_F(ModuleTardiskTest, GoesByTheLabelOfTheProgramFirst) {
  Bring("gear");
  PublishThree({"-d toy three exec grant"});
  EXPECT_EQ(From(kFirst, toy), Outcome({.domain = kFirst + 2, .isSecure = true}));
  for (const char* const other : {"-d toy one exec grant", "-d toy three exec revoke",
                                  "-d toy three enter grant", "-d toy three tardisk_exec grant"}) {
    PublishThree({other});
    ExpectToEnter(toy);
  }
}

TEST_F(ModuleTardiskTest, FollowsTheFileAndNotItsPath) {
  PublishThree();
  Bring("gear");
  std::ofstream(toy, std::ios::app) << "written in place";
  ExpectToEnter(toy);
  const std::string elsewhere = kPlace + "/tool/elsewhere";
  fs::create_hard_link(toy, elsewhere);
  PublishThree();
  ExpectToEnter(elsewhere);
  // Another file gets its number, where the file system gives the lowest one.
  fs::remove(toy);
  fs::remove(elsewhere);
  fs::copy_file("/bin/busybox", toy);
  ExpectToStay(toy);
}

TEST_F(ModuleTardiskTest, TellsFilesInMemoryApart) {
  const std::string place = "/tmp/memory";
  fs::create_directories(place);
  ASSERT_EQ(mount("none", place.c_str(), "tmpfs", 0, nullptr), 0);
  const std::string program = place + "/cat";
  fs::copy_file("/bin/busybox", program);
  fs::copy_file("/bin/busybox", place + "/other");
  module->LearnLabels();
  PublishThree();
  module->TellTardiskFiles({Brought(program, "gear")});
  ExpectToEnter(program);
  ExpectToStay(place + "/other");
  EXPECT_EQ(umount2(place.c_str(), MNT_DETACH), 0);
}

TEST_F(ModuleTardiskTest, ForgetsWhatItIsToldNoMore) {
  PublishThree();
  const auto old = Brought(toy, "gear");
  const auto other = Brought(ProgramOf("tool"), "gear");
  module->TellTardiskFiles({old, other});
  ExpectToEnter(toy);
  ExpectToEnter(ProgramOf("tool"));
  auto relabelled = old;
  relabelled.label = kLabels.at("tool");
  module->TellTardiskFiles({relabelled, other});
  ExpectToStay(toy);
  ExpectToEnter(ProgramOf("tool"));
  auto earlier = old;
  ++earlier.generation;
  module->TellTardiskFiles({earlier});
  ExpectToStay(toy);
  ExpectToStay(ProgramOf("tool"));
}

TEST_F(ModuleTardiskTest, RefusesWhoeverIsControlledAndWhatIsNotThere) {
  PublishThree();
  Bring("gear");
  ExpectToFail(toy, ExecuteTraced);
  ExpectToFail(toy, ExecuteWithSharedDirectories);
  ExpectToFail(toy, ExecuteWithoutNewPrivileges);
  ExpectToFail(toy, ExecuteInUserNamespace);
  PublishThree({"-a toy execute revoke"});
  ExpectToFail(toy);
  Publish(Domains({{"one", {"-d gear two tardisk_exec grant"}}}));
  ExpectToFail(toy);
}

TEST_F(ModuleTardiskTest, EntersByAScriptThatIsExecutedByItsPath) {
  PublishThree();
  const std::string script = kPlace + "/toy/script";
  WriteScript(script, "/bin/busybox sh");
  fs::create_symlink(script, kPlace + "/link");
  module->TellTardiskFiles({Brought(script, "gear"), Brought(ProgramOf("gear"), "gear")});
  ExpectToEnter(script);
  ExpectToFail(kPlace + "/link");
  WriteScript(kPlace + "/tool/interpreted", ProgramOf("gear"));
  ExpectToStay(kPlace + "/tool/interpreted");
}

// ---- What the rules say, held against the kernel

std::vector<std::string> SomeTransitions(std::mt19937& chance) {
  const auto one = [&chance](const std::vector<std::string>& words) {
    return words[chance() % words.size()];
  };
  std::vector<std::string> rules(2 + chance() % 5);
  for (std::string& rule : rules) {
    rule = chance() % 3 == 0
               ? "-a " + one({"tool", "gear", "toy"}) + " execute " + one({"grant", "revoke"})
               : "-d " + one({"tool", "gear", "toy"}) + " " + one({"d0", "d1", "d2", "gone"}) +
                     " " + one({"exec", "exec", "tardisk_exec", "tardisk_exec", "enter"}) + " " +
                     one({"grant", "grant", "revoke"});
  }
  return rules;
}

// The labels of the tardisks that the programs came from; one came from none.
const std::map<std::string, std::string> kTardiskOf = {{"tool", "gear"}, {"gear", "gear"}};

std::optional<std::string> DomainBehind(const std::string& label, const std::string& kind,
                                        const InstalledDomain& domain) {
  for (const Policy::Rule* const rule : RulesOf(domain, Policy::RuleKind::kDomainTransition)) {
    if (rule->Grants() && rule->words[0] == label && rule->words[2] == kind &&
        rule->words[1] != domain.name)
      return rule->words[1];
  }
  return std::nullopt;
}

std::optional<std::string> DomainBehindProgram(const std::string& label,
                                               const InstalledDomain& domain) {
  const auto own = DomainBehind(label, "exec", domain);
  const auto tardisk = kTardiskOf.find(label);
  if (own || tardisk == kTardiskOf.end()) return own;
  return DomainBehind(tardisk->second, "tardisk_exec", domain);
}

Outcome ExpectedOf(const std::string& label, const InstalledDomain& domain) {
  const Policy::FileQuestion question = {Policy::FileAccess::kExecute, ProgramOf(label), label,
                                         false};
  if (!Decide(question, domain).IsAllowed()) return Refused();
  const auto next = DomainBehindProgram(label, domain);
  if (!next) return {.domain = domain.id};
  if (*next == "gone") return Refused();
  return {.domain = kFirst + static_cast<unsigned int>(next->back() - '0')};
}

TEST_F(ModuleExecutionTest, EntersWhatTheRulesSay) {
  Enforce::TardiskFiles brought;
  for (const auto& [program, label] : kTardiskOf)
    brought.push_back(Brought(ProgramOf(program), label));
  module->TellTardiskFiles(brought);
  std::mt19937 chance(3);
  int entered = 0;
  int refused = 0;
  for (int turn = 0; turn < 10; ++turn) {
    const auto domains = Domains({{"d0", SomeTransitions(chance)},
                                  {"d1", SomeTransitions(chance)},
                                  {"d2", SomeTransitions(chance)}});
    Publish(domains);
    for (const InstalledDomain& domain : domains) {
      for (const auto& [label, number] : kLabels) {
        const Outcome expected = ExpectedOf(label, domain);
        entered += expected.domain.value_or(domain.id) != domain.id;
        refused += expected.error != 0;
        EXPECT_EQ(Start(domain.id, Executor(ProgramOf(label), Execute)), expected)
            << "turn " << turn << ", " << domain.name << ", " << label;
      }
    }
  }
  EXPECT_GT(entered, 10);
  EXPECT_GT(refused, 10);
}

}  // namespace
}  // namespace EnforceTest
