// Processes that ask for a domain and execute a program there: hunts for one that is still outside,
// for one that is in before its program, and for one that comes back.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "host/enforce/kernel.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

using Words = std::vector<std::string>;

constexpr char kShell[] = "/bin/busybox";
const Words kChangeRoot = {kShell, "chroot", "/", kShell, "true"};
const Words kNothing = {kShell, "true"};

int Execute(Words words) {
  std::vector<char*> pointers;
  for (std::string& word : words) pointers.push_back(word.data());
  pointers.push_back(nullptr);
  execv(pointers[0], pointers.data());
  return errno;
}

int ExecuteByThread(const Words& words) {
  int error = 0;
  std::thread([&] { error = Execute(words); }).join();
  return error;
}

class ModuleEnteringTest : public ModuleTest {
 protected:
  void SetUp() override {
    ModuleTest::SetUp();
    if (!IsSkipped()) module->Publish(Granting(0), 2);
  }

  int Ask(unsigned int domain) const {
    return ErrorOf(Enforce::Kernel::EnterWithNextProgram(module->EnteringMap(), domain));
  }

  // What the program ends with that a process executes which has asked for the domain.
  int ResultIn(unsigned int domain, const Words& words) const {
    return InChild([&] { return Ask(domain) == 0 ? Execute(words) : 99; });
  }
};

TEST_F(ModuleEnteringTest, CountsFromTheNextProgramOn) {
  EXPECT_EQ(InChild([&] {
              if (Ask(kDomain) != 0 || ChangeRoot() != 0) return 99;
              if (module->DomainOf(getpid())) return 98;
              return Execute(kChangeRoot);
            }),
            1);
  EXPECT_EQ(ResultIn(kOther, kChangeRoot), 0);
}

TEST_F(ModuleEnteringTest, LeavesTheDomainThatItWasIn) {
  module->SetLevel(kOther, Level::kPermissive);
  EXPECT_EQ(
      In(kOther,
         [&] { return InChild([&] { return Ask(kDomain) == 0 ? Execute(kChangeRoot) : 99; }); }),
      1);
  EXPECT_EQ(In(kOther, [&] { return InChild([&] { return Execute(kChangeRoot); }); }), 0);
}

TEST_F(ModuleEnteringTest, IsRefusedToWhoIsEnforced) {
  EXPECT_EQ(In(kDomain, [&] { return Ask(kOther); }), EPERM);
}

TEST_F(ModuleEnteringTest, CountsOnce) {
  int orders[2];
  int isOpen[2];
  ASSERT_EQ(pipe2(orders, O_CLOEXEC), 0);
  ASSERT_EQ(pipe2(isOpen, O_CLOEXEC), 0);
  const pid_t child = fork();
  if (child == 0) {
    dup2(orders[0], STDIN_FILENO);
    if (Ask(kDomain) != 0) _exit(99);
    Execute({kShell, "sh", "-c", "read word; exec /bin/busybox chroot / /bin/busybox true"});
    _exit(98);
  }
  close(isOpen[1]);
  char none = 0;
  EXPECT_EQ(read(isOpen[0], &none, 1), 0);
  EXPECT_EQ(module->DomainOf(child), kDomain);
  module->Place(child, kOther);
  EXPECT_EQ(write(orders[1], "\n", 1), 1);
  EXPECT_EQ(ResultOf(child), 0);
  for (const int end : {orders[0], orders[1], isOpen[0]}) close(end);
}

TEST_F(ModuleEnteringTest, CountsForNoneOfItsChildren) {
  EXPECT_EQ(InChild([&] {
              return Ask(kDomain) == 0 ? InChild([] { return Execute(kChangeRoot); }) : 99;
            }),
            0);
}

// It would be the first thread afterwards, of which nobody has asked anything.
TEST_F(ModuleEnteringTest, IsRefusedToAnotherThread) {
  EXPECT_EQ(InChild([&] { return Ask(kDomain) == 0 ? ExecuteByThread(kNothing) : 99; }), EPERM);
  EXPECT_EQ(InChild([&] { return ExecuteByThread(kNothing); }), 0);
}

TEST_F(ModuleEnteringTest, TakesNoCallOfTheDomain) {
  const auto domain = Numbered({"-s execve revoke"});
  module->Publish(PlanModule({domain}, CAP_LAST_CAP), 2);
  EXPECT_EQ(ResultIn(kDomain, kNothing), 0);
  EXPECT_EQ(ResultIn(kDomain, {kShell, "env", kShell, "true"}), 126);
}

TEST_F(ModuleEnteringTest, RunsNothingThatTheDomainMayNotExecute) {
  module->Publish(PlanModule({NumberedStrictly({"-r / rw"})}, CAP_LAST_CAP), 2);
  EXPECT_GT(ResultIn(kDomain, kNothing), 1000);
  module->Publish(PlanModule({NumberedStrictly({kAllFiles})}, CAP_LAST_CAP), 2);
  EXPECT_EQ(ResultIn(kDomain, kNothing), 0);
}

TEST_F(ModuleEnteringTest, RunsNothingInADomainThatThereIsNot) {
  EXPECT_GT(ResultIn(99, kNothing), 1000);
}

}  // namespace
}  // namespace EnforceTest
