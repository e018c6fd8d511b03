// Programs that are watched: hunts for calls that are not told, paths that are told otherwise than
// the program means them, and ends that get lost.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <set>
#include <string>
#include <vector>

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

}  // namespace
}  // namespace EnforceTest
