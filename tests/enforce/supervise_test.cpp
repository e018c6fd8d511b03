// Programs that are watched: hunts for calls that are not told, paths that are told otherwise than
// the program means them, and ends that get lost.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <string>
#include <vector>

#include "host/enforce/supervise/asked.h"
#include "host/enforce/supervise/supervisor.h"

namespace EnforceTest {
namespace {

using Enforce::Attempt;
using Enforce::SupervisedEnd;
using testing::Contains;
using testing::Not;

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
