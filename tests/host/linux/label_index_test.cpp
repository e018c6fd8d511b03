// The label index of a root: it has what the files have, also where they inherit, are linked or
// mounted; and it counts only as long as no label was changed, by whomever.

#include "host/linux/operation/label_index.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <functional>
#include <random>
#include <string_view>
#include <utility>

#include "child_process.h"
#include "host/linux/common/host_error.h"
#include "host/linux/files/labelled_places.h"
#include "host/linux/files/security_attribute.h"
#include "host/linux/operation/boot.h"
#include "host/linux/operation/file_label.h"
#include "host/linux/operation/label_journal.h"
#include "host/linux/operation/noted_labels.h"
#include "host/linux/state/host_state.h"
#include "label_calls.h"
#include "scratch_root.h"

namespace LinuxHostTest {
namespace {

using Enforce::kNotIndexed;
using Enforce::LabelIndex;
using LinuxHost::HostState;
using LinuxHost::ReadLabelIndex;
using LinuxHost::RefreshLabelIndex;

constexpr std::uint32_t kMine = 7;
constexpr std::uint32_t kOther = 8;

// Is done when the label of a file with the name "file" is about to be read, once.
std::function<void()> atFile;

std::string TextOf(const std::vector<Enforce::LabelledPlace>& places) {
  std::string text;
  for (const auto& place : places) {
    text += place.path + (place.isDirectory ? "/=" : "=") + std::to_string(place.label) + " ";
  }
  return text;
}

// The places of the tree in the working directory.
class PlacesOfATree : public ScratchRootTest {
 protected:
  void SetUp() override {
    for (const char* path : {"a/one", "a/sub/two", "b/three"}) scratch.Write(path, "text");
  }

  static std::string Places() {
    return TextOf(LinuxHost::FindLabelledPlaces(".", LinuxHost::LabelAttribute()));
  }

  // What the superuser has, and no other user.
  static bool DropRightToLookEverywhere() {
    __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
    __user_cap_data_struct data[2];
    if (syscall(SYS_capget, &header, data) != 0) return false;
    data[0].effective &= ~(1U << CAP_DAC_OVERRIDE | 1U << CAP_DAC_READ_SEARCH);
    return syscall(SYS_capset, &header, data) == 0;
  }

  static void GiveFirst(const std::vector<std::string>& paths) {
    for (const std::string& path : paths) {
      if (Give(path, 2, 0) != "0") throw std::runtime_error("no label for " + path);
    }
  }
};

TEST_F(PlacesOfATree, AreThoseThatDifferFromAbove) {
  EXPECT_EQ(Run([] {
              GiveFirst({".", "a", "a/one", "a/sub", "a/sub/two", "b", "b/three"});
              Give("a/sub", kMine);
              Give("a/sub/two", kMine);
              Give("b/three", kOther);
              return Places();
            }),
            "//=2 /a/sub/=7 /b/three=8 ");
}

TEST_F(PlacesOfATree, InheritWhereTheyCarryNothing) {
  EXPECT_EQ(Run([] {
              GiveFirst({".", "a"});
              Give("a", kMine);
              Give("a/sub/two", kOther, 0);
              return Places();
            }),
            "//=2 /a/=7 /a/sub/two=8 ");
}

TEST_F(PlacesOfATree, HaveNoLabelWhereNoneIsAbove) {
  EXPECT_EQ(Run([] {
              Give("a/one", kMine, 0);
              return Places();
            }),
            "//=1 /a/one=7 ");
}

TEST_F(PlacesOfATree, HaveTheLabelOfAFileByEachOfItsNames) {
  EXPECT_EQ(Run([] {
              GiveFirst({"."});
              Give("b", kMine, 0);
              if (link("a/one", "b/linked") != 0) return std::string("no link");
              const std::string inherited = Places();
              Give("a/one", kOther, 0);
              return inherited + "then " + Places();
            }),
            "//=2 /b/=7 then //=2 /a/one=8 /b/=7 /b/linked=8 ");
}

TEST_F(PlacesOfATree, MayHaveAnyName) {
  EXPECT_EQ(Run([] {
              GiveFirst({"."});
              for (const char* path : {"a\nb", "a.b", "a b", "\xff"}) {
                std::ofstream(path).put('x');
                Give(path, kMine, 0);
              }
              Give("a/one", kOther, 0);
              return Places();
            }),
            "//=2 /a/one=8 /a\nb=7 /a b=7 /a.b=7 /\xff=7 ");
}

TEST_F(PlacesOfATree, AreNoLinks) {
  EXPECT_EQ(Run([] {
              GiveFirst({"."});
              Give("b", kMine, 0);
              if (symlink("../b", "a/link") != 0) return std::string("no link");
              if (mkfifo("a/fifo", 0600) != 0) return std::string("no fifo");
              return Places();
            }),
            "//=2 /b/=7 ");
}

TEST_F(PlacesOfATree, AreUnknownWhereTheyCannotBeLookedAt) {
  EXPECT_EQ(Run([]() -> std::string {
              GiveFirst({".", "a", "b"});
              chmod("a", 0);
              if (!DropRightToLookEverywhere()) return "(the right cannot be dropped)";
              const std::string places = Places();
              chmod("a", 0700);
              return places;
            }),
            "//=2 /a/=0 ");
}

TEST_F(PlacesOfATree, AreUnknownWhereAnotherMountBegins) {
  const std::string found = Run([]() -> std::string {
    if (unshare(CLONE_NEWNS) != 0 || mount("", "/", "", MS_REC | MS_PRIVATE, "") != 0) {
      return "(no mounts)";
    }
    GiveFirst({".", "a", "b"});
    Give("b", kMine);
    mkdir("c", 0755);
    std::ofstream("d").put('x');
    if (mount("b", "c", "", MS_BIND, "") != 0 || mount("tmpfs", "a", "tmpfs", 0, "") != 0 ||
        mount("b/three", "d", "", MS_BIND, "") != 0) {
      return "(no mounts)";
    }
    return Places();
  });
  if (found == "(no mounts)") GTEST_SKIP() << "nothing can be mounted here";
  EXPECT_EQ(found, "//=2 /a/=0 /b/=7 /c/=0 /d=0 ");
}

// A root that was booted, as its own processes see it.
class IndexOfARoot : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!MayChangeRoot()) GTEST_SKIP() << "the root directory cannot be changed here";
    for (const char* path : {"a/one", "a/two", "b/three"}) scratch.Write(path, "text");
  }

  // What `body` answers in a root that was booted and has its index.
  std::string InBooted(const std::function<std::string()>& body) {
    return scratch.RunInside([&] {
      LinuxHost::StartPolicy(
          LinuxHost::AssembleRoot({.policyRoot = "/etc/zorvan/secpolicy", .policyTardisks = {}}));
      RefreshLabelIndex();
      return body();
    });
  }

  // The index as text, or why there is none.
  static std::string Index() {
    try {
      const LabelIndex index = ReadLabelIndex();
      return TextOf({index.begin(), index.end()});
    } catch (const Braxo::Lib::BraxoException& failure) {
      return failure.what();
    }
  }

  static std::string RefreshAnd(const std::function<std::string()>& look) {
    const bool made = RefreshLabelIndex();
    return (made ? "made " : "kept ") + look();
  }

  const std::string old =
      "The label index /run/secpolicy/labels.index is not of the labels as they are. Run "
      "\"secpolicy load\", which makes a new one";
  const std::string none =
      "There is no label index /run/secpolicy/labels.index. Run \"secpolicy load\", which makes a "
      "new one";

  ScratchRoot scratch;
};

TEST_F(IndexOfARoot, IsMadeOnceAfterABoot) {
  EXPECT_EQ(InBooted([] { return Words({Index(), RefreshAnd(Index)}); }), "//=2  kept //=2 ");
}

TEST_F(IndexOfARoot, BelongsToItsUserAlone) {
  EXPECT_EQ(InBooted([] {
              struct stat status {};
              stat("/run/secpolicy/labels.index", &status);
              return std::to_string(status.st_mode & 0777) +
                     (status.st_uid == geteuid() ? " mine" : " of another");
            }),
            std::to_string(0600) + " mine");
}

TEST_F(IndexOfARoot, IsOldWhenTheLibraryHasLabelledAFile) {
  EXPECT_EQ(InBooted([] {
              Give("/a/one", kMine);
              return Index();
            }),
            old);
  EXPECT_EQ(InBooted([] {
              Give("/a/one", kMine);
              return RefreshAnd(Index);
            }),
            "made //=2 /a/one=7 ");
}

TEST_F(IndexOfARoot, IsOldWhenTheCommandHasLabelledAFile) {
  EXPECT_EQ(InBooted([] {
              LinuxHost::ReplaceLabel("/a/one", kMine);
              return Index();
            }),
            old);
}

TEST_F(IndexOfARoot, StaysWhereAFileGetsTheLabelThatItCarries) {
  EXPECT_EQ(InBooted([] {
              LinuxHost::ReplaceLabel("/a/one", 2);
              return Index();
            }),
            "//=2 ");
}

TEST_F(IndexOfARoot, IsOldWhenAFileIsGivenTheLabelThatItInherits) {
  EXPECT_EQ(InBooted([] {
              std::ofstream("/a/new").put('x');
              LinuxHost::ReplaceLabel("/a/new", 2);
              return RefreshAnd(Index);
            }),
            "made //=2 ");
}

TEST_F(IndexOfARoot, StaysWhileLabelsAreOnlyNoted) {
  EXPECT_EQ(InBooted([this] {
              const LinuxHost::NotedLabels notes(LinuxHost::LabelNotes::kForLater);
              Give("/a/one", kMine);
              const std::string noted = Index();
              notes.Apply();
              return noted + (Index() == old ? "then old" : "then " + Index());
            }),
            "//=2 then old");
}

TEST_F(IndexOfARoot, StaysWhereTheLastLabelOfAFileIsTheOneThatItCarries) {
  EXPECT_EQ(InBooted([] {
              const LinuxHost::NotedLabels notes(LinuxHost::LabelNotes::kForLater);
              for (const char* path : {"/a/one", "/a/two", "/a/one"}) Give(path, kMine);
              for (const char* path : {"/a/two", "/a/one"}) Give(path, 2);
              notes.Apply();
              return Index();
            }),
            "//=2 ");
}

TEST_F(IndexOfARoot, IsGoneBeforeLabelsAreGivenThatMayBePutBack) {
  EXPECT_EQ(InBooted([] {
              const LinuxHost::NotedLabels notes(LinuxHost::LabelNotes::kForLater);
              Give("/a/one", 2);
              LinuxHost::LabelJournal same("/run/secpolicy/host.db");
              same.Keep(notes);
              return Index();
            }),
            "//=2 ");
  EXPECT_EQ(InBooted([] {
              const LinuxHost::NotedLabels notes(LinuxHost::LabelNotes::kForLater);
              Give("/a/one", kMine);
              LinuxHost::LabelJournal journal("/run/secpolicy/host.db");
              journal.Keep(notes);
              return Index();
            }),
            none);
}

TEST_F(IndexOfARoot, IsOldAsSoonAsABootLabelsFiles) {
  EXPECT_EQ(InBooted([] {
              LinuxHost::AssembleRoot({.policyRoot = "/etc", .policyTardisks = {}});
              return Index();
            }),
            old);
}

TEST_F(IndexOfARoot, IsMadeAnewWhereItIsGoneOrDamaged) {
  EXPECT_EQ(InBooted([] {
              unlink("/run/secpolicy/labels.index");
              return Words({Index(), RefreshAnd(Index)});
            }),
            none + " made //=2 ");
  EXPECT_EQ(InBooted([] {
              std::ofstream("/run/secpolicy/labels.index").put('x');
              return Words({Index(), RefreshAnd(Index)});
            }),
            "The label index /run/secpolicy/labels.index is damaged (it is cut off). Run "
            "\"secpolicy load\", which makes a new one made //=2 ");
}

TEST_F(IndexOfARoot, IsRefusedWhenOthersMayHaveWrittenIt) {
  EXPECT_EQ(InBooted([] {
              chmod("/run/secpolicy/labels.index", 0622);
              return Index();
            }),
            "Refusing the label index: other users may write /run/secpolicy/labels.index. Take "
            "that right from them (chmod go-w), and make it anew");
}

TEST_F(IndexOfARoot, OfAnotherStateIsNotTaken) {
  EXPECT_EQ(InBooted([this] {
              std::filesystem::rename("/run/secpolicy/labels.index", "/run/secpolicy/kept");
              Give("/a/one", kMine);
              RefreshLabelIndex();
              std::filesystem::rename("/run/secpolicy/kept", "/run/secpolicy/labels.index");
              return Index() == old ? "old" : Index();
            }),
            "old");
}

TEST_F(IndexOfARoot, IsNotMadeWhereNothingWasLabelled) {
  EXPECT_EQ(scratch.RunInside([] {
    HostState::Current();
    return RefreshAnd(Index);
  }),
            "kept " + none);
  EXPECT_EQ(scratch.RunInside([] { return RefreshAnd(Index); }), "kept " + none);
}

TEST_F(IndexOfARoot, IsMissingWithItsState) {
  EXPECT_EQ(scratch.RunInside([] { return RefreshAnd(Index); }),
            "kept There is no label index, as nothing is installed. Run \"secpolicy boot\"");
}

// Directories and files by chance, some labelled, some made later, and each as its reader sees it.
TEST_F(IndexOfARoot, AgreesWithTheLabelOfEveryFile) {
  EXPECT_EQ(InBooted([] {
              std::mt19937 random(7);
              std::vector<std::string> directories = {"/many"};
              mkdir("/many", 0755);
              for (int number = 0; number < 400; ++number) {
                const std::string path = directories[random() % directories.size()] + "/n" +
                                         std::to_string(random() % 50);
                if (random() % 3 == 0) {
                  if (mkdir(path.c_str(), 0755) == 0) directories.push_back(path);
                } else {
                  std::ofstream(path).put('x');
                }
                if (random() % 2 == 0) Give(path, 2 + random() % 4);
              }
              if (link("/a/one", "/many/linked") != 0) return std::string("no link");
              RefreshLabelIndex();
              const LabelIndex index = ReadLabelIndex();
              std::string wrong;
              int count = 0;
              for (const char* top : {"/a", "/b", "/many", "/tardisks"}) {
                for (const auto& entry : std::filesystem::recursive_directory_iterator(top)) {
                  const std::string path = entry.path();
                  const auto label = LinuxHost::ReadLabel(path.c_str());
                  if (!label || index.LabelOf(path) != label->id) wrong += path + " ";
                  ++count;
                }
              }
              return count > 100 ? wrong : std::string("too few files");
            }),
            "");
}

// What one process labels while another walks is in the index, or makes it old.
TEST_F(IndexOfARoot, NeverHasOldLabelsWhoeverLabelsMeanwhile) {
  for (int number = 0; number < 300; ++number) {
    scratch.Write("many/file" + std::to_string(number), "x");
  }
  EXPECT_EQ(InBooted([] {
              std::string wrong;
              for (int round = 0; round < 10; ++round) {
                const std::string path = "/many/file" + std::to_string(round * 29);
                const auto label = static_cast<std::uint32_t>(100 + round);
                ChildProcess labels([&] { Give(path, label); });
                ChildProcess makes([] { RefreshLabelIndex(); });
                RefreshLabelIndex();
                wrong += labels.Wait() + makes.Wait();
                try {
                  if (ReadLabelIndex().LabelOf(path) != label) wrong += path + " ";
                } catch (const LinuxHost::HostError& failure) {
                  if (failure.Code() != ESTALE) wrong += failure.what();
                }
                RefreshLabelIndex();
                if (ReadLabelIndex().LabelOf(path) != label) wrong += path + " in the end ";
              }
              return wrong;
            }),
            "");
}

// A walk that was in a directory which is somewhere else by then begins again.
TEST_F(IndexOfARoot, IsMadeAlsoWhereADirectoryIsMoved) {
  scratch.Write("b/moved/file", "x");
  EXPECT_EQ(InBooted([] {
              Give("/b/moved/file", kMine);
              atFile = [] { std::filesystem::rename("/b/moved", "/a/moved"); };
              return RefreshAnd(Index);
            }),
            "made //=2 /a/moved/file=7 ");
}

}  // namespace

// An extern "C" function is the same one in any namespace.
extern "C" ssize_t lgetxattr(const char* path, const char* name, void* value,
                             std::size_t size) noexcept {
  if (atFile && std::string_view(path) == "file") std::exchange(atFile, nullptr)();
  return syscall(SYS_lgetxattr, path, name, value, size);
}

}  // namespace LinuxHostTest
