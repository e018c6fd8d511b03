// Labels that a load notes and gives at its end: read back as if given, refused where giving would
// be, given to nothing that was replaced meanwhile.

#include "host/linux/operation/noted_labels.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/fs.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "child_process.h"
#include "host/linux/files/security_attribute.h"
#include "label_calls.h"
#include "scratch_root.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::LabelNotes;
using LinuxHost::NotedLabels;

// The real attribute, whatever is noted.
std::string RealLabel(const char* path) {
  std::uint32_t id = 0;
  for (const char* name : {"security.bpf.zorvan", "user.zorvan.security"}) {
    if (lgetxattr(path, name, &id, sizeof id) == sizeof id) return std::to_string(id);
  }
  return "none";
}

std::string Changes(const NotedLabels& notes) {
  std::string text;
  for (const auto& change : notes.Changes()) {
    text += change.path + ":" + std::to_string(change.before) + (change.IsLasting() ? ">" : "=") +
            std::to_string(change.after) + " ";
  }
  return text;
}

// What could not be given.
std::string Apply(const NotedLabels& notes) {
  std::string text;
  for (const auto& failure : notes.Apply()) {
    text += failure.path + ":" + strerrorname_np(failure.error) + " ";
  }
  return text.empty() ? "all" : text;
}

// Sets or clears a flag that keeps even the superuser from changing the file at `path`.
bool SetFlag(const std::string& path, unsigned int flag, bool isSet) {
  const int file = open(path.c_str(), O_RDONLY);
  unsigned int flags = 0;
  bool done = ioctl(file, FS_IOC_GETFLAGS, &flags) == 0;
  flags = isSet ? flags | flag : flags & ~flag;
  done = done && ioctl(file, FS_IOC_SETFLAGS, &flags) == 0;
  close(file);
  return done;
}

bool BindReadOnly(const char* path) {
  return unshare(CLONE_NEWNS) == 0 &&
         mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
         mount(path, path, nullptr, MS_BIND, nullptr) == 0 &&
         mount("none", path, nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr) == 0;
}

// The file "labelled" carries 7; "bare" carries nothing. The directory "tree" carries 6, and its
// files nothing.
class NotedLabelsTest : public ScratchRootTest, public ::testing::WithParamInterface<LabelNotes> {
 protected:
  void SetUp() override {
    scratch.Write("labelled", "text");
    scratch.Write("bare", "text");
    scratch.Write("tree/one", "text");
    scratch.Write("tree/two", "text");
    ASSERT_EQ(Run([] { return Words({Give("labelled", 7, 0), Give("tree", 6, 0)}); }), "0 0");
  }

  std::string RunNoting(const std::function<std::string(const NotedLabels& notes)>& body,
                        const std::string& passedOver = "") {
    return Run([&] { return body(NotedLabels(GetParam(), passedOver)); });
  }
};

INSTANTIATE_TEST_SUITE_P(Purposes, NotedLabelsTest,
                         testing::Values(LabelNotes::kDryRun, LabelNotes::kForLater));

TEST_P(NotedLabelsTest, ReadsBackWhatItGaveAndLeavesTheFile) {
  EXPECT_EQ(RunNoting([](const NotedLabels&) {
              return Words({Label("labelled"), Give("labelled", 8), Label("labelled"),
                            Give("labelled", 9), Label("labelled"), RealLabel("labelled")});
            }),
            "7 0 8 0 9 7");
  EXPECT_EQ(Run([] { return Label("labelled"); }), "7");
}

TEST_P(NotedLabelsTest, EndWithTheirObject) {
  EXPECT_EQ(Run([&]() -> std::string {
              { const NotedLabels notes(GetParam()); }
              return Words({Give("labelled", 8), RealLabel("labelled")});
            }),
            "0 8");
}

TEST_P(NotedLabelsTest, FailsWhereGivingWould) {
  std::filesystem::create_symlink("nowhere", scratch.Root() / "dangling");
  std::filesystem::create_symlink("loop", scratch.Root() / "loop");
  std::filesystem::create_symlink("bare", scratch.Root() / "link");
  const auto give = [] {
    return Words({Give("bare", 8), Give("missing", 8), Give("labelled/x", 8), Give("labelled/", 8),
                  Give("", 8), Give("dangling", 8), Give("loop", 8), Give("link", 8),
                  Give("none/x", 8), Give(std::string(5000, 'x'), 8),
                  Give(std::string(300, 'x') + "/y", 8), Label("bare")});
  };
  const std::string really = Run(give);
  EXPECT_EQ(really,
            "ENODATA ENOENT ENOTDIR ENOTDIR ENOENT ENOENT ELOOP ENODATA ENOENT ENAMETOOLONG "
            "ENAMETOOLONG ENODATA");
  EXPECT_EQ(RunNoting([&](const NotedLabels& notes) { return give() + Changes(notes); }), really);
}

TEST_P(NotedLabelsTest, TakesOnlyIdentifiersAndReplacements) {
  EXPECT_EQ(RunNoting([](const NotedLabels& notes) {
              return Words(
                  {Told(Zorvan::Kernel::SetXattr("labelled", kLabelName, "odd", 3, XATTR_REPLACE)),
                   Give("labelled", 8, 0), Changes(notes)});
            }),
            "EINVAL EINVAL ");
}

TEST_P(NotedLabelsTest, NeedsBufferThatIsLargeEnough) {
  EXPECT_EQ(RunNoting([](const NotedLabels&) {
              char buffer[3];
              return Words({Give("labelled", 8),
                            Told(Zorvan::Kernel::GetXattr("labelled", kLabelName, nullptr, 0)),
                            Told(Zorvan::Kernel::GetXattr("labelled", kLabelName, buffer, 3))});
            }),
            "0 4 ERANGE");
}

TEST_P(NotedLabelsTest, TellsChangesInTheOrderOfPaths) {
  EXPECT_EQ(RunNoting([](const NotedLabels& notes) {
              return Words({Give("tree", 8), Give("labelled", 8), Give("tree", 9), Changes(notes)});
            }),
            "0 0 0 labelled:7>8 tree:6>9 ");
}

TEST_P(NotedLabelsTest, TellsAlsoAFileWhoseLabelIsTheSameInTheEnd) {
  EXPECT_EQ(RunNoting([](const NotedLabels& notes) {
              return Words({Give("labelled", 8), Give("labelled", 7), Changes(notes)});
            }),
            "0 0 labelled:7=7 ");
}

TEST_P(NotedLabelsTest, KnowsAFileByAllItsNames) {
  std::filesystem::create_hard_link(scratch.Root() / "labelled", scratch.Root() / "alias");
  std::filesystem::create_symlink("../labelled", scratch.Root() / "tree/link");
  EXPECT_EQ(RunNoting([&](const NotedLabels& notes) {
              return Words({Give("tree/link", 8), Give("alias", 9), Label("labelled"),
                            std::to_string(notes.Changes().size()), Apply(notes),
                            RealLabel("alias"), RealLabel("tree/link")});
            }),
            "0 0 9 1 all 9 none");
}

TEST_P(NotedLabelsTest, TakesFilesThatInherit) {
  EXPECT_EQ(RunNoting([](const NotedLabels& notes) {
              return Words({Label("tree/one"), Give("tree/one", 8), Label("tree/one"),
                            RealLabel("tree/one"), Changes(notes), Apply(notes),
                            RealLabel("tree/one"), Label("tree/two")});
            }),
            "6 0 8 none tree/one:6>8  all 8 6");
}

TEST_P(NotedLabelsTest, TellsALabelThatIsNoIdentifier) {
  EXPECT_EQ(Run([&] {
              setxattr("labelled", LinuxHost::LabelAttribute().c_str(), "", 0, XATTR_REPLACE);
              const NotedLabels notes(GetParam());
              return Words({Give("labelled", 8), Changes(notes)});
            }),
            "0 labelled:0>8 ");
}

TEST_P(NotedLabelsTest, LeaveALabelOfNoBytesToItsFile) {
  EXPECT_EQ(RunNoting([](const NotedLabels&) -> std::string {
              if (lsetxattr("tree/one", LinuxHost::LabelAttribute().c_str(), "", 0, 0) != 0) {
                return "(no empty attributes here)";
              }
              errno = ENODATA;
              return Told(Zorvan::Kernel::GetXattr("tree/one", kLabelName, nullptr, 0));
            }),
            "0");
}

TEST_P(NotedLabelsTest, PassesOverADirectory) {
  scratch.Write("own/file", "text");
  std::filesystem::create_symlink("own", scratch.Root() / "link");
  EXPECT_EQ(RunNoting(
                [](const NotedLabels& notes) {
                  return Words({Give("own", 8), Give("own/file", 8), Give("link//file", 8),
                                Give("own/gone", 8), Give("bare", 8), Give("labelled", 8),
                                Changes(notes) + RealLabel("own/file")});
                },
                "own"),
            "0 0 0 0 ENODATA 0 labelled:7>8 none");
}

TEST_P(NotedLabelsTest, FailsOnAFileThatCannotBeChanged) {
  const std::string path = scratch.Root() / "labelled";
  for (const unsigned int flag : {unsigned{FS_IMMUTABLE_FL}, unsigned{FS_APPEND_FL}}) {
    if (!SetFlag(path, flag, true)) GTEST_SKIP() << "this file system makes no file immutable";
    const std::string really = Run([] { return Give("labelled", 8); });
    const std::string noted =
        RunNoting([](const NotedLabels& notes) { return Give("labelled", 8) + Changes(notes); });
    SetFlag(path, flag, false);
    EXPECT_EQ(really, "EPERM");
    EXPECT_EQ(noted, "EPERM");
  }
}

TEST_P(NotedLabelsTest, FailsOnAReadOnlyFileSystem) {
  if (geteuid() != 0) GTEST_SKIP() << "only the superuser mounts";
  EXPECT_EQ(Run([&]() -> std::string {
              Give("tree/one", 5);
              if (!BindReadOnly("tree")) return "(no mounts here)";
              const std::string really = Words({Give("tree/one", 8), Give("tree", 8)});
              const NotedLabels notes(GetParam());
              return Words({really, Give("tree/one", 8), Give("tree", 8), Changes(notes)});
            }),
            "EROFS EROFS EROFS EROFS ");
}

// There, a try to write copies the file.
TEST_P(NotedLabelsTest, AreAsElsewhereOnAnOverlayAndDryRunsWithoutTrace) {
  if (geteuid() != 0) GTEST_SKIP() << "only the superuser mounts";
  for (const char* directory : {"/upper", "/work", "/merged"}) {
    std::filesystem::create_directory(scratch.Directory().string() + directory);
  }
  const std::string options = "lowerdir=" + scratch.Root().string() +
                              ",upperdir=" + (scratch.Directory() / "upper").string() +
                              ",workdir=" + (scratch.Directory() / "work").string();
  const std::string noted = RunNoting([&](const NotedLabels&) -> std::string {
    const std::string merged = scratch.Directory() / "merged";
    if (unshare(CLONE_NEWNS) != 0 ||
        mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0 ||
        mount("none", merged.c_str(), "overlay", 0, options.c_str()) != 0 ||
        chdir(merged.c_str()) != 0) {
      return "(no overlay here)";
    }
    const std::string given =
        Words({Give("labelled", 8), Give("bare", 8), Give("missing", 8), Give("tree/one", 8),
               Label("labelled"), RealLabel("labelled")});
    if (GetParam() == LabelNotes::kDryRun &&
        !std::filesystem::is_empty(scratch.Directory() / "upper")) {
      return given + " copied";
    }
    constexpr unsigned long kAsItIs = MS_REMOUNT | MS_BIND | MS_RDONLY;
    if (mount("none", merged.c_str(), nullptr, kAsItIs, nullptr) != 0) return "(no overlay here)";
    return given + ", " + Give("labelled", 9);
  });
  if (noted == "(no overlay here)") GTEST_SKIP() << noted;
  EXPECT_EQ(noted, "0 ENODATA ENOENT 0 8 7, EROFS");
}

TEST_P(NotedLabelsTest, AppliesInTheOrderOfGiving) {
  EXPECT_EQ(RunNoting([](const NotedLabels& notes) {
              return Words({Give("tree/one", 8), Give("labelled", 3), Give("tree", 9),
                            Give("tree/one", 4), Give("./tree/.", 5), Give("tree/two", 2),
                            Apply(notes), RealLabel("tree/one"), RealLabel("labelled"),
                            RealLabel("tree"), RealLabel("tree/two")});
            }),
            "0 0 0 0 0 0 all 4 3 5 2");
}

TEST_P(NotedLabelsTest, AppliesTheRestWhereAFileHasGone) {
  EXPECT_EQ(RunNoting([](const NotedLabels& notes) {
              const std::string given =
                  Words({Give("tree/one", 8), Give("tree/two", 8), Give("labelled", 8)});
              unlink("tree/one");
              return Words({given, Apply(notes), RealLabel("tree/two"), RealLabel("labelled")});
            }),
            "0 0 0 tree/one:ENOENT  8 8");
}

TEST_P(NotedLabelsTest, AppliesToAFileThatWasSavedAnew) {
  EXPECT_EQ(RunNoting([](const NotedLabels& notes) {
              const std::string given = Give("tree/one", 8);
              close(open("tree/new", O_CREAT | O_WRONLY | O_CLOEXEC, 0600));
              rename("tree/new", "tree/one");
              return Words({given, Apply(notes), RealLabel("tree/one")});
            }),
            "0 all 8");
}

TEST_P(NotedLabelsTest, FollowNothingThatWasReplacedByALinkSince) {
  scratch.Write("deep/tree/one", "text");
  EXPECT_EQ(Run([&]() -> std::string {
              Words({Give("deep", 6, 0), Give("deep/tree", 6), Give("deep/tree/one", 6)});
              const NotedLabels notes(GetParam());
              const std::string given = Words({Give("tree/one", 8), Give("tree/two", 8)});
              unlink("tree/one");
              if (symlink("../labelled", "tree/one") != 0) return "no way";
              rename("tree", "aside");
              const std::string behindLink = symlink("deep/tree", "tree") == 0 ? Apply(notes) : "";
              unlink("tree");
              rename("aside", "tree");
              const std::string atLink = notes.Apply().size() == 1 ? "told" : "missed";
              return Words({given, behindLink, RealLabel("deep/tree/one"), atLink,
                            RealLabel("labelled"), RealLabel("tree/two")});
            }),
            "0 0 tree/one:ENOENT tree/two:ENOENT  6 told 7 8");
}

TEST_P(NotedLabelsTest, ComesBackToTheWorkingDirectory) {
  EXPECT_EQ(RunNoting([](const NotedLabels& notes) {
              return Words({Give("tree/one", 8), Apply(notes), RealLabel("tree/one"),
                            Give("labelled", 8), RealLabel("labelled")});
            }),
            "0 all 8 0 7");
}

TEST_P(NotedLabelsTest, AppliesWithFewDescriptors) {
  for (int i = 0; i < 100; ++i) scratch.Write("tree/" + std::to_string(i) + "/file", "text");
  EXPECT_EQ(RunNoting([](const NotedLabels& notes) -> std::string {
              std::size_t given = 0;
              for (int i = 0; i < 100; ++i) {
                const std::string file = "tree/" + std::to_string(i) + "/file";
                if (Give(file, 8) == "0") ++given;
              }
              if (!LimitDescriptors()) return "no way";
              return Words({std::to_string(given), Apply(notes), RealLabel("tree/99/file")});
            }),
            "100 all 8");
}

}  // namespace
}  // namespace LinuxHostTest
