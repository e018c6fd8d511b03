// Labels of a load that did not end: each file gets back what it carried, also after a kill, and
// nothing that was replaced meanwhile.

#include "host/linux/operation/label_journal.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/file.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <functional>
#include <initializer_list>
#include <utility>

#include "host/linux/common/host_error.h"
#include "host/linux/files/security_attribute.h"
#include "host/linux/state/host_state.h"
#include "label_calls.h"
#include "scratch_root.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::LabelJournal;
using LinuxHost::LabelNotes;
using LinuxHost::LabelsPutBack;
using LinuxHost::NotedLabels;

// Is done when a file is about to be locked, once.
std::function<void()> beforeLock;

std::string AllCarried(std::initializer_list<const char*> paths) {
  std::string text;
  for (const char* path : paths) text += (text.empty() ? "" : " ") + Carried(path);
  return text;
}

std::string StatePath() { return LinuxHost::HostState::Current().Database().Path(); }
std::string JournalPath() { return LinuxHost::HostState::Current().Directory() + "/labels.undo"; }
std::string Journals() { return access(JournalPath().c_str(), F_OK) == 0 ? "there" : "gone"; }

std::string Told(const LabelsPutBack& back) {
  std::string text = std::to_string(back.count);
  for (const auto& failure : back.failures) {
    text += " " + failure.path + ":" + strerrorname_np(failure.error);
  }
  return text;
}

std::string LeftOver() {
  const auto back = LabelJournal::PutBackLeftOver(StatePath());
  return back ? Told(*back) : "none";
}

// The files "one" and "two" in "tree" carry 7 and nothing, "tree" carries 6.
class Journal : public ScratchRootTest {
 protected:
  void SetUp() override {
    for (const char* path : {"tree/one", "tree/two", "tree/sub/three"}) scratch.Write(path, "text");
    ASSERT_EQ(Run([] { return Words({Give("tree", 6, 0), Give("tree/one", 7, 0)}); }), "0 0");
  }

  // Notes labels for all files, and keeps what they have.
  static void NoteAndKeep(const NotedLabels& notes, LabelJournal& journal) {
    Give("tree/one", 8);
    Give("tree/two", 8);
    Give("tree/sub/three", 8);
    Give("tree", 8);
    Give("tree/one", 9);
    journal.Keep(notes);
  }

  // A process that has given the labels, and is killed while it still has its journal.
  static void GiveAndDie() {
    const pid_t child = fork();
    if (child == 0) {
      const NotedLabels notes(LabelNotes::kForLater);
      LabelJournal journal(StatePath());
      NoteAndKeep(notes, journal);
      notes.Apply();
      raise(SIGKILL);
    }
    waitpid(child, nullptr, 0);
  }
};

TEST_F(Journal, PutsBackWhatFilesCarried) {
  EXPECT_EQ(Run([] {
              const NotedLabels notes(LabelNotes::kForLater);
              LabelJournal journal(StatePath());
              NoteAndKeep(notes, journal);
              notes.Apply();
              const std::string given =
                  AllCarried({"tree", "tree/one", "tree/two", "tree/sub", "tree/sub/three"});
              const std::string back = Told(journal.PutBack());
              return given + ", " + back + ", " +
                     AllCarried({"tree", "tree/one", "tree/two", "tree/sub", "tree/sub/three"});
            }),
            "8 9 8 ENODATA 8, 4, 6 7 ENODATA ENODATA ENODATA");
}

TEST_F(Journal, ChangesNothingThatIsAsItWas) {
  EXPECT_EQ(Run([] {
              const NotedLabels notes(LabelNotes::kForLater);
              LabelJournal journal(StatePath());
              NoteAndKeep(notes, journal);
              return Told(journal.PutBack()) + ", " + AllCarried({"tree", "tree/one", "tree/two"});
            }),
            "0, 6 7 ENODATA");
}

TEST_F(Journal, GoesWithItsObject) {
  EXPECT_EQ(Run([] {
              std::string during;
              {
                const NotedLabels notes(LabelNotes::kForLater);
                LabelJournal journal(StatePath());
                NoteAndKeep(notes, journal);
                notes.Apply();
                during = Journals();
              }
              return Words({during, Journals(), LeftOver(), Carried("tree/one")});
            }),
            "there gone none 9");
}

TEST_F(Journal, IsPutBackByTheNextProcessWhenItsOwnDied) {
  EXPECT_EQ(Run([] {
              GiveAndDie();
              return Words({Carried("tree/one"), Journals(), LeftOver(), Journals(),
                            AllCarried({"tree", "tree/one", "tree/two"})});
            }),
            "9 there 4 gone 6 7 ENODATA");
}

TEST_F(Journal, IsPutBackBeforeTheNextOneBegins) {
  EXPECT_EQ(Run([] {
              GiveAndDie();
              LabelJournal next(StatePath());
              return Words({AllCarried({"tree", "tree/one", "tree/two"}), Told(next.PutBack())});
            }),
            "6 7 ENODATA 0");
}

TEST_F(Journal, IsLeftAloneWhileItsProcessLives) {
  EXPECT_EQ(Run([] {
              const NotedLabels notes(LabelNotes::kForLater);
              LabelJournal journal(StatePath());
              NoteAndKeep(notes, journal);
              notes.Apply();
              std::string second;
              try {
                LabelJournal another(StatePath());
              } catch (const LinuxHost::HostError& error) {
                second = strerrorname_np(error.Code());
              }
              return Words({LeftOver(), second, Journals(), Carried("tree/one")});
            }),
            "none EAGAIN there 9");
}

TEST_F(Journal, CountsAsFarAsItsWriterCame) {
  EXPECT_EQ(Run([] {
              const NotedLabels notes(LabelNotes::kForLater);
              std::string whole;
              {
                LabelJournal journal(StatePath());
                NoteAndKeep(notes, journal);
                whole = Content(JournalPath());
              }
              notes.Apply();
              std::size_t put = 0;
              for (std::size_t size = 0; size <= whole.size(); ++size) {
                const int file = open(JournalPath().c_str(), O_CREAT | O_WRONLY | O_TRUNC, 0600);
                const bool isWritten =
                    write(file, whole.data(), size) == static_cast<ssize_t>(size);
                close(file);
                const auto back = LabelJournal::PutBackLeftOver(StatePath());
                if (!isWritten || !back || !back->failures.empty()) return std::string("failed");
                put += back->count;
              }
              return Words({std::to_string(put), AllCarried({"tree", "tree/one", "tree/two"})});
            }),
            "4 6 7 ENODATA");
}

TEST_F(Journal, FollowsNothingThatWasReplaced) {
  scratch.Write("other/one", "text");
  EXPECT_EQ(
      Run([]() -> std::string {
        Give("other/one", 3, 0);
        const NotedLabels notes(LabelNotes::kForLater);
        LabelJournal journal(StatePath());
        NoteAndKeep(notes, journal);
        notes.Apply();
        unlink("tree/one");
        rename("tree/sub", "aside");
        if (symlink("../other/one", "tree/one") != 0 || symlink("../other", "tree/sub") != 0) {
          return "no way";
        }
        const LabelsPutBack back = journal.PutBack();
        return Words({std::to_string(back.count), std::to_string(back.failures.size()),
                      AllCarried({"tree", "tree/two", "other/one", "aside/three"})});
      }),
      "2 2 6 ENODATA 3 8");
}

TEST_F(Journal, OfAnotherProcessThatTookItsPlaceIsLeftAlone) {
  EXPECT_EQ(Run([] {
              GiveAndDie();
              beforeLock = [] {
                rename(JournalPath().c_str(), "aside");
                close(open(JournalPath().c_str(), O_CREAT | O_WRONLY, 0600));
              };
              return Words({LeftOver(), Journals(), Carried("tree/one")});
            }),
            "none there 9");
}

TEST_F(Journal, ThatCannotBeOpenedIsTold) {
  const std::string told = Run([]() -> std::string {
    GiveAndDie();
    const std::string path = JournalPath();
    const char* const journal = path.c_str();
    if (unshare(CLONE_NEWNS) != 0 || mount("", "/", "", MS_REC | MS_PRIVATE, "") != 0 ||
        mount(journal, journal, "", MS_BIND, "") != 0 ||
        mount("", journal, "", MS_REMOUNT | MS_BIND | MS_RDONLY, "") != 0) {
      return "(no mounts)";
    }
    return LeftOver();
  });
  if (told == "(no mounts)") GTEST_SKIP() << "nothing can be mounted here";
  EXPECT_THAT(told, testing::MatchesRegex("Unable to open the journal of labels /.*/labels.undo: "
                                          "Read-only file system"));
}

TEST_F(Journal, ThatCannotBeWrittenIsTold) {
  const std::string told = Run([]() -> std::string {
    const NotedLabels notes(LabelNotes::kForLater);
    LabelJournal journal(StatePath());
    Give("tree/one", 8);
    signal(SIGXFSZ, SIG_IGN);
    rlimit limit = {};
    getrlimit(RLIMIT_FSIZE, &limit);
    limit.rlim_cur = 0;
    if (setrlimit(RLIMIT_FSIZE, &limit) != 0) return "no limit";
    journal.Keep(notes);
    return "kept";
  });
  EXPECT_THAT(told, testing::MatchesRegex("Unable to write the journal of labels /.*/labels.undo: "
                                          "File too large"));
}

TEST_F(Journal, IsRefusedWhereOthersMayHaveWrittenIt) {
  EXPECT_NE(Run([]() -> std::string {
              StatePath();
              close(open(JournalPath().c_str(), O_CREAT | O_WRONLY, 0600));
              chmod(JournalPath().c_str(), 0666);
              return LeftOver();
            }).find("other users may write"),
            std::string::npos);
  EXPECT_NE(Run([]() -> std::string {
              unlink(JournalPath().c_str());
              if (symlink("/dev/null", JournalPath().c_str()) != 0) return "no way";
              return LeftOver();
            }).find("is not a regular file"),
            std::string::npos);
}

}  // namespace

// An extern "C" function is the same one in any namespace.
extern "C" int flock(int file, int operation) noexcept {
  if (beforeLock) std::exchange(beforeLock, nullptr)();
  return static_cast<int>(syscall(SYS_flock, file, operation));
}

}  // namespace LinuxHostTest
