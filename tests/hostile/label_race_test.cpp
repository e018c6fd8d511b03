// A tree that changes while it is walked. What the walk then does is described in SECURITY.md;
// these tests hold it to that.
#include <fcntl.h>
#include <linux/fs.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <map>
#include <set>

#include "hostile_tree.h"

namespace HostileTest {
namespace {

// What happens right before, and right after, a label is written to a path.
using Change = std::function<void()>;
std::map<std::string, Change> before;
std::map<std::string, Change> after;

// What happens right after the type of the entry of that name was looked at.
std::map<std::string, Change> afterLook;

void RunOnce(std::map<std::string, Change>& changes, const std::string& path) {
  const auto change = changes.extract(path);
  if (!change.empty()) change.mapped()();
}

}  // namespace
}  // namespace HostileTest

// The Linux host's calls end here, so that a change can come between two steps of a walk.
extern "C" __attribute__((visibility("default"))) int setxattr(const char* path, const char* name,
                                                               const void* value, std::size_t size,
                                                               int flags) {
  HostileTest::RunOnce(HostileTest::before, path);
  const auto result = syscall(SYS_setxattr, path, name, value, size, flags);
  HostileTest::RunOnce(HostileTest::after, path);
  return static_cast<int>(result);
}

extern "C" __attribute__((visibility("default"))) int statx(int directory, const char* path,
                                                            int flags, unsigned int mask,
                                                            struct statx* status) {
  const auto result = syscall(SYS_statx, directory, path, flags, mask, status);
  HostileTest::RunOnce(HostileTest::afterLook, path);
  return static_cast<int>(result);
}

namespace HostileTest {
namespace {

class LabelRace : public HostileTree {
 protected:
  void TearDown() override {
    before.clear();
    after.clear();
    afterLook.clear();
    HostileTree::TearDown();
  }

  // Puts a link to `target` in the place of the entry at `path`.
  static void ReplaceByLink(const std::string& path, const std::string& target) {
    RemoveTree(path);
    EXPECT_EQ(symlink(target.c_str(), path.c_str()), 0);
  }
};

TEST_F(LabelRace, FollowsALinkThatReplacedAFileAfterItWasListed) {
  MakeFile(*this / "victim");
  MakeFile(Outside() + "/target");
  MakeFile(Outside() + "/bystander");
  before[*this / "victim"] = [&] { ReplaceByLink(*this / "victim", Outside() + "/target"); };

  EXPECT_EQ(LabelTree(), "");

  EXPECT_EQ(LabelOf(Outside() + "/target"), kLabel);
  EXPECT_EQ(LabelOf(Outside() + "/bystander"), kFirstLabel);
  EXPECT_EQ(LabelOf(Outside()), kFirstLabel);
}

TEST_F(LabelRace, GivesNoFirstLabelThroughALink) {
  MakeFile(*this / "victim");
  const std::string target = Unlabelled() + "/target";
  close(open(target.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644));
  before[*this / "victim"] = [&] { ReplaceByLink(*this / "victim", target); };

  EXPECT_EQ(LabelTree(), "Unable to set file label (toolLabel) for file " + *this / "victim" +
                             ": No data available");

  EXPECT_EQ(LabelOf(target), "");
}

// What inherits a label has one.
TEST_F(LabelRace, FollowsALinkToAFileThatInherits) {
  MakeFile(*this / "victim");
  const std::string heir = Outside() + "/target";
  close(open(heir.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644));
  before[*this / "victim"] = [&] { ReplaceByLink(*this / "victim", heir); };

  EXPECT_EQ(LabelTree(), "");

  EXPECT_EQ(LabelOf(heir), kLabel);
  EXPECT_EQ(LabelOf(Outside()), kFirstLabel);
}

// A file without a label is looked at once more, and what is written then is written right there.
TEST_F(LabelRace, FollowsNoLinkThatReplacesAFileOnceItWasFoundToInherit) {
  const std::string victim = *this / "victim";
  close(open(victim.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644));
  MakeFile(Outside() + "/target");
  afterLook["victim"] = [&] { ReplaceByLink(victim, Outside() + "/target"); };

  LabelTree();

  EXPECT_TRUE(afterLook.empty());
  EXPECT_EQ(LabelOf(Outside() + "/target"), kFirstLabel);
}

TEST_F(LabelRace, GivesAFileThatAppearedTheLabel) {
  MakeFile(*this / "file");
  const std::string late = *this / "late";
  after[Tree()] = [&] { close(open(late.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644)); };

  EXPECT_EQ(LabelTree(), "");

  EXPECT_EQ(LabelOf(late), kLabel);
}

TEST_F(LabelRace, LabelsTheTreeBehindALinkThatReplacedADirectory) {
  MakeDirectory(*this / "victim");
  MakeDirectory(Outside() + "/target");
  MakeFile(Outside() + "/target/file");
  MakeFile(Outside() + "/bystander");
  after[*this / "victim"] = [&] { ReplaceByLink(*this / "victim", Outside() + "/target"); };

  EXPECT_EQ(LabelTree(), "");

  EXPECT_EQ(LabelOf(Outside() + "/target"), kLabel);
  EXPECT_EQ(LabelOf(Outside() + "/target/file"), kLabel);
  EXPECT_EQ(LabelOf(Outside() + "/bystander"), kFirstLabel);
}

TEST_F(LabelRace, FollowsNoLinkThatWasThereWhenTheDirectoryWasListed) {
  MakeDirectory(*this / "late");
  MakeFile(Outside() + "/target");
  // The directory is written twice, and listed after the second time.
  after[*this / "late"] = [&] {
    after[*this / "late"] = [&] {
      ASSERT_EQ(symlink((Outside() + "/target").c_str(), (*this / "late/link").c_str()), 0);
      ASSERT_EQ(symlink(Outside().c_str(), (*this / "late/directory").c_str()), 0);
    };
  };

  EXPECT_EQ(LabelTree(), "");

  EXPECT_TRUE(after.empty());
  EXPECT_EQ(LabelOf(Outside() + "/target"), kFirstLabel);
  EXPECT_EQ(LabelOf(Outside()), kFirstLabel);
}

TEST_F(LabelRace, EndsAtAFileThatVanished) {
  MakeFile(*this / "victim");
  before[*this / "victim"] = [&] { RemoveTree(*this / "victim"); };

  EXPECT_EQ(LabelTree(), "Unable to set file label (toolLabel) for file " + *this / "victim" +
                             ": No such file or directory");
}

TEST_F(LabelRace, EndsAtADirectoryThatVanishedOnceLabelled) {
  MakeDirectory(*this / "victim");
  after[*this / "victim"] = [&] {
    after[*this / "victim"] = [&] { RemoveTree(*this / "victim"); };
  };

  EXPECT_EQ(LabelTree(), "Unable to open directory " + *this / "victim");
}

TEST_F(LabelRace, EndsAtALinkToItself) {
  MakeFile(*this / "victim");
  before[*this / "victim"] = [&] { ReplaceByLink(*this / "victim", "victim"); };

  EXPECT_EQ(LabelTree(), "Unable to set file label (toolLabel) for file " + *this / "victim" +
                             ": Too many levels of symbolic links");
}

TEST_F(LabelRace, EndsWhereTheTreeWasMovedAway) {
  MakeDirectory(*this / "moved");
  MakeFile(*this / "moved/file");
  before[*this / "moved/file"] = [&] {
    ASSERT_EQ(rename((*this / "moved").c_str(), (Outside() + "/moved").c_str()), 0);
  };

  EXPECT_EQ(LabelTree(), "Unable to set file label (toolLabel) for file " + *this / "moved/file" +
                             ": No such file or directory");

  EXPECT_EQ(LabelOf(Outside() + "/moved/file"), kFirstLabel);
}

// A process that changes the tree as fast as it can, until it is destroyed.
class Racer {
 public:
  explicit Racer(const std::function<void()>& change) : process(fork()) {
    while (process == 0) change();
  }
  Racer(const Racer&) = delete;
  Racer& operator=(const Racer&) = delete;
  ~Racer() {
    kill(process, SIGKILL);
    waitpid(process, nullptr, 0);
  }

 private:
  pid_t process;
};

void Exchange(const std::string& one, const std::string& other) {
  syscall(SYS_renameat2, AT_FDCWD, one.c_str(), AT_FDCWD, other.c_str(), RENAME_EXCHANGE);
}

TEST_F(LabelRace, SurvivesARacerAndKeepsToItsLinks) {
  MakeDirectory(*this / "files");
  MakeFile(*this / "files/file");
  MakeDirectory(*this / "files/directory");
  MakeFile(*this / "files/directory/inner");
  MakeDirectory(Outside() + "/aim");
  MakeFile(Outside() + "/aim/target");
  MakeFile(Outside() + "/bystander");
  const std::string links = Outside() + "/links";
  MakeDirectory(links);
  ASSERT_EQ(symlink((Outside() + "/aim/target").c_str(), (links + "/file").c_str()), 0);
  ASSERT_EQ(symlink((Outside() + "/aim").c_str(), (links + "/directory").c_str()), 0);
  const std::string passing = *this / "files/passing";
  const auto vanished = [&](const std::string& name) {
    return "Unable to set file label (toolLabel) for file " + *this / name +
           ": No such file or directory";
  };
  const std::set<std::string> documented = {
      "",
      vanished("files/directory/inner"),
      vanished("files/directory/target"),
      vanished("files/passing"),
  };
  const Racer racer([&] {
    Exchange(*this / "files/file", links + "/file");
    Exchange(*this / "files/directory", links + "/directory");
    close(open(passing.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644));
    unlink(passing.c_str());
  });

  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(LongRun() ? 60 : 2);
  unsigned int walks = 0;
  while (std::chrono::steady_clock::now() < end) {
    const std::string failure = LabelTree();
    ASSERT_TRUE(documented.contains(failure)) << failure;
    ++walks;
  }

  RecordProperty("walks", std::to_string(walks));
  EXPECT_GT(walks, 10U);
  EXPECT_EQ(LabelOf(Outside()), kFirstLabel);
  EXPECT_EQ(LabelOf(Outside() + "/bystander"), kFirstLabel);
  EXPECT_EQ(LabelOf(links), kFirstLabel);
}

}  // namespace
}  // namespace HostileTest
