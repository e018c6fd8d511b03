// Labels that files without one have from a directory above: from the nearest, never across a
// mount or through a link, at any depth.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "child_process.h"
#include "host/linux/files/security_attribute.h"
#include "host/linux/operation/file_label.h"
#include "label_calls.h"
#include "scratch_root.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

// The same for who does not follow links.
std::string OwnOrInherited(const char* path) {
  const auto label = LinuxHost::ReadLabel(path);
  if (!label) return strerrorname_np(errno);
  return std::to_string(label->id) + (label->isInherited ? " inherited" : " own");
}

bool MountInPrivate(const char* source, const char* target, const char* type, unsigned long flags) {
  return unshare(CLONE_NEWNS) == 0 &&
         mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
         mount(source, target, type, flags, nullptr) == 0;
}

// Refuses the calls that take an entry of a directory, as an older kernel does.
bool RefuseEntryCalls(int error) {
  sock_filter filter[] = {
      BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, 463, 1, 0),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, 464, 0, 1),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | static_cast<unsigned int>(error)),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
  };
  const sock_fprog program = {std::size(filter), filter};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}

// "tree" carries 7, nothing above it and nothing in it carries a label.
class InheritedLabel : public ScratchRootTest {
 protected:
  void SetUp() override {
    scratch.Write("bare", "text");
    scratch.Write("tree/file", "text");
    scratch.Write("tree/deep/er/file", "text");
    scratch.Write("elsewhere/file", "text");
    ASSERT_EQ(Run([] { return Give("tree", 7, 0); }), "0");
  }
};

// What lies at the path by then carries another label.
TEST_F(InheritedLabel, OfAnOpenFileIsItsOwn) {
  EXPECT_EQ(Run([] {
              const int file = open("tree/file", O_RDONLY);
              Give("tree/file", 8, 0);
              rename("tree/file", "tree/moved");
              rename("elsewhere/file", "tree/file");
              const auto label = LinuxHost::ReadLabel(file, "tree/file");
              return label ? std::to_string(label->id) : strerrorname_np(errno);
            }),
            "8");
  EXPECT_EQ(Run([] {
              const auto label = LinuxHost::ReadLabel(open("tree/file", O_RDONLY), "tree/file");
              return label ? std::to_string(label->id) : strerrorname_np(errno);
            }),
            "7");
}

TEST_F(InheritedLabel, IsThatOfTheNearestLabelledDirectory) {
  EXPECT_EQ(Run([] {
              const std::string before =
                  Label("tree/file") + " " + Label("tree/deep") + " " + Label("tree/deep/er/file");
              Give("tree/deep", 8, 0);
              return before + ", " +
                     Words({Label("tree/file"), Label("tree/deep/er"), Label("tree/deep/er/file")});
            }),
            "7 7 7, 7 8 8");
}

TEST_F(InheritedLabel, IsNoneWhereNoDirectoryAboveHasOne) {
  EXPECT_EQ(Run([] {
              return Words({Label("bare"), Give("bare", 8), OwnOrInherited("elsewhere"), Label("/"),
                            Carried("bare")});
            }),
            "ENODATA ENODATA ENODATA ENODATA ENODATA");
}

TEST_F(InheritedLabel, BecomesTheFilesOwnWhenReplaced) {
  EXPECT_EQ(Run([] {
              const std::string replaced = Give("tree/deep/er/file", 9);
              Give("tree", 6, 0);
              return Words({replaced, Label("tree/deep/er/file"), Carried("tree/deep/er/file"),
                            Label("tree/deep/er"), Carried("tree/deep/er")});
            }),
            "0 9 9 6 ENODATA");
}

TEST_F(InheritedLabel, IsToldFromTheFilesOwn) {
  EXPECT_EQ(Run([] { return OwnOrInherited("tree") + ", " + OwnOrInherited("tree/file"); }),
            "7 own, 7 inherited");
}

TEST_F(InheritedLabel, IsReplacedByWhoDoesNotFollowLinks) {
  EXPECT_EQ(
      Run([] {
        return Words({Told(LinuxHost::ReplaceLabel("tree/file", 9)), OwnOrInherited("tree/file")});
      }),
      "0 9 own");
}

TEST_F(InheritedLabel, IsThatOfTheDirectoryItselfByWhateverName) {
  scratch.Write("tree/sub/x", "text");
  EXPECT_EQ(Run([] {
              std::string labels;
              for (const char* path : {"tree/sub", "tree/sub/", "tree/sub/.", "tree//sub/x",
                                       "tree/deep/er/..", "./tree/sub/../deep/er/file"}) {
                labels += Label(path) + " ";
              }
              if (chdir("tree/sub") != 0) return std::string("no way");
              return labels +
                     Words({Label("."), Label("x"), Label(".."), Give(".", 5), Carried("../sub")});
            }),
            "7 7 7 7 7 7 7 7 7 0 5");
}

TEST_F(InheritedLabel, IsThatOfTheLinksTarget) {
  std::filesystem::create_symlink("../tree/file", scratch.Root() / "elsewhere/into");
  std::filesystem::create_symlink("../bare", scratch.Root() / "tree/out");
  std::filesystem::create_symlink("tree/deep", scratch.Root() / "way");
  std::filesystem::create_symlink("../elsewhere/into", scratch.Root() / "tree/twice");
  EXPECT_EQ(Run([] {
              return Words({Label("elsewhere/into"), Label("tree/out"), Label("way/er/file"),
                            Label("tree/twice"), Give("elsewhere/into", 9), Carried("tree/file"),
                            Give("tree/out", 9), Carried("bare")});
            }),
            "7 ENODATA 7 7 0 9 ENODATA ENODATA");
}

TEST_F(InheritedLabel, IsNotThatOfALink) {
  std::filesystem::create_symlink("file", scratch.Root() / "tree/link");
  std::filesystem::create_symlink("nowhere", scratch.Root() / "tree/dangling");
  EXPECT_EQ(Run([]() -> std::string {
              return Words({OwnOrInherited("tree/link"), OwnOrInherited("tree/dangling"),
                            Label("tree/dangling"),
                            LinuxHost::ReplaceLabel("tree/link", 9) == 0 ? "given" : "refused",
                            Carried("tree/file")});
            }),
            "ENODATA ENODATA ENOENT refused ENODATA");
}

TEST_F(InheritedLabel, IsReadAsAnAttributeIs) {
  EXPECT_EQ(Run([] {
              char buffer[3];
              return Words(
                  {Told(Zorvan::Kernel::GetXattr("tree/file", kLabelName, nullptr, 0)),
                   Told(Zorvan::Kernel::GetXattr("tree/file", kLabelName, buffer, sizeof buffer))});
            }),
            "4 ERANGE");
}

TEST_F(InheritedLabel, ThatCannotBeReadIsAFailureAsOfAnAttribute) {
  EXPECT_EQ(Run([]() -> std::string {
              const auto read = [](const char* path) {
                const ssize_t result = Zorvan::Kernel::GetXattr(path, kLabelName, nullptr, 0);
                return std::to_string(result) + " " + strerrorname_np(errno);
              };
              const std::string none = read("bare");
              // Room for the directory of the file, and for none above it.
              const int next = open("/", O_PATH | O_CLOEXEC);
              close(next);
              const rlim_t most = static_cast<rlim_t>(next) + 1;
              const rlimit limit = {most, most};
              if (setrlimit(RLIMIT_NOFILE, &limit) != 0) return "no limit";
              return none + ", " + read("tree/file");
            }),
            "-1 ENODATA, -1 EMFILE");
}

TEST_F(InheritedLabel, IsCreatedAndSetAsWithoutIt) {
  const std::uint32_t id = 9;
  EXPECT_EQ(Run([&] {
              return Words({Told(Zorvan::Kernel::SetXattr("tree/file", kLabelName, &id, sizeof id,
                                                          XATTR_CREATE)),
                            Carried("tree/file")});
            }),
            "0 9");
}

TEST_F(InheritedLabel, IsFoundInAnyDepthWithFewDescriptors) {
  EXPECT_EQ(Run([]() -> std::string {
              if (!LimitDescriptors() || chdir("tree") != 0) return "no way";
              for (int level = 0; level < 400; ++level) {
                if (mkdir("d", 0755) != 0 || chdir("d") != 0) return std::strerror(errno);
              }
              close(open("bottom", O_CREAT | O_WRONLY | O_CLOEXEC, 0600));
              return Words({OwnOrInherited("bottom"), Give("bottom", 9), OwnOrInherited("bottom"),
                            OwnOrInherited(".")});
            }),
            "7 inherited 0 9 own 7 inherited");
}

TEST_F(InheritedLabel, IsFoundOnAKernelThatTakesNoEntries) {
  for (const int error : {ENOSYS, EPERM}) {
    EXPECT_EQ(
        Run([&]() -> std::string {
          Give("tree/deep", 8, 0);
          if (!RefuseEntryCalls(error)) return "no way";
          const std::string before = Words({Label("tree/deep/er/file"), Label("tree/file")});
          const std::string replaced = Give("tree/deep/er/file", 9);
          removexattr("tree/deep", LinuxHost::LabelAttribute().c_str());
          return before + ", " +
                 Words({replaced, Carried("tree/deep/er/file"), Label("tree/deep"), Label("bare")});
        }),
        "8 7, 0 9 7 ENODATA");
    Run([] { return Told(removexattr("tree/deep/er/file", LinuxHost::LabelAttribute().c_str())); });
  }
}

TEST_F(InheritedLabel, EndsAtAnotherFileSystem) {
  EXPECT_EQ(Run([]() -> std::string {
              if (!MountInPrivate("none", "tree/deep", "tmpfs", 0)) return "(no mounts here)";
              close(open("tree/deep/file", O_CREAT | O_WRONLY | O_CLOEXEC, 0600));
              return Words({Label("tree/deep"), Label("tree/deep/file"), Give("tree/deep/file", 9),
                            Label("tree/file")});
            }),
            geteuid() == 0 ? "ENODATA ENODATA ENODATA 7" : "(no mounts here)");
}

// A directory of the same file system that is mounted into the tree is no part of it, and a tree
// that is mounted elsewhere keeps its label.
TEST_F(InheritedLabel, EndsAtABindMount) {
  EXPECT_EQ(Run([]() -> std::string {
              if (!MountInPrivate("elsewhere", "tree/deep", nullptr, MS_BIND))
                return "(no mounts here)";
              return Words({Label("tree/deep"), Label("tree/deep/file"), Give("tree/deep/file", 9),
                            Label("tree/file")});
            }),
            geteuid() == 0 ? "ENODATA ENODATA ENODATA 7" : "(no mounts here)");
  EXPECT_EQ(Run([]() -> std::string {
              if (!MountInPrivate("tree", "elsewhere", nullptr, MS_BIND)) return "(no mounts here)";
              return Words({Label("elsewhere"), Label("elsewhere/deep/er/file"),
                            Give("elsewhere/file", 9), Carried("tree/file")});
            }),
            geteuid() == 0 ? "7 7 0 9" : "(no mounts here)");
  EXPECT_EQ(Run([]() -> std::string {
              if (!MountInPrivate("bare", "tree/deep/er/file", nullptr, MS_BIND))
                return "(no mounts here)";
              return Words({Label("tree/deep/er/file"), Give("tree/deep/er/file", 9)});
            }),
            geteuid() == 0 ? "ENODATA ENODATA" : "(no mounts here)");
}

TEST_F(InheritedLabel, IsThatOfPipesToo) {
  EXPECT_EQ(Run([]() -> std::string {
              if (mkfifo("tree/pipe", 0600) != 0) return std::strerror(errno);
              const bool mayCarry = LinuxHost::CanCarryLabel(S_IFIFO, LinuxHost::LabelAttribute());
              const std::string label = Label("tree/pipe");
              const std::string replaced = Give("tree/pipe", 9);
              return label + (replaced == (mayCarry ? "0" : "EPERM") ? " as it should" : replaced);
            }),
            "7 as it should");
}

TEST_F(InheritedLabel, OfAPipeIsReplacedByWayOfProcOnAKernelThatTakesNoEntries) {
  const auto replace = [](bool hasProc) -> std::string {
    mkfifo("tree/pipe", 0600);
    if (!hasProc && !MountInPrivate("none", "/proc", "tmpfs", 0)) return "(no mounts here)";
    if (!RefuseEntryCalls(ENOSYS)) return "no way";
    return Words({Give("tree/pipe", 9), Label("tree/pipe")});
  };
  EXPECT_EQ(Run([&] { return replace(false); }), geteuid() == 0 ? "ENODATA 7" : "(no mounts here)");
  EXPECT_EQ(Run([&] { return replace(true); }), geteuid() == 0 ? "0 9" : "EPERM 7");
}

}  // namespace
}  // namespace LinuxHostTest
