// A boot: every file gets its first label and none of the running system, links lead nowhere, a
// failure keeps what was installed, and where each inode came from is told.

#include "host/linux/operation/boot.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "host/linux/files/security_attribute.h"
#include "host/linux/operation/file_label.h"
#include "host/linux/operation/settings.h"
#include "orinconfigstore/config_store.h"
#include "scratch_root.h"
#include "tar_image.h"
#include "teskctl/security.h"
#include "teskctl/sysinfo.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;
using TeskCtl::Security::TeskAccessInterfaceImpl;

class Boot : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!MayChangeRoot()) GTEST_SKIP() << "the root directory cannot be changed here";
  }

  void Save(const std::string& tardisk, const TarImage& image) {
    image.Save(scratch.Root() / "tardisks" / tardisk);
  }

  // Boots the root, then returns what `look` sees; "well" without one.
  std::string BootAnd(const std::function<std::string()>& look = [] { return "well"; }) {
    return scratch.RunInside([&] {
      LinuxHost::StartPolicy(LinuxHost::AssembleRoot(rules));
      return look();
    });
  }

  ScratchRoot scratch;
  LinuxHost::TardiskRules rules{.policyRoot = "/etc/zorvan/secpolicy", .policyTardisks = {}};
};

// The label that the file at `path` carries itself, or why it has none.
std::string Label(const std::string& path) {
  const auto label = LinuxHost::ReadLabel(path.c_str());
  if (!label) return std::strerror(errno);
  if (label->isInherited) return std::strerror(ENODATA);
  return TeskAccessInterfaceImpl().GetLabel(label->id, TESKACCESS_LABEL_OBJECT);
}

// The tardisk that the file at `path` came from, as the inode's record names it.
std::string Origin(const std::string& path) {
  struct stat status {};
  if (lstat(path.c_str(), &status) != 0) return std::strerror(errno);
  char record[548];
  TeskCtl::Util::Sysinfo node(TeskCtl::Util::KSI_NODE_system_kelpfs_inodes_stats);
  node.AddInstancePath(status.st_ino);
  node.Get(record, sizeof record);
  return record + 36;
}

TEST_F(Boot, UnpacksTardisksInByteOrderOfName) {
  Save("b.tgz", TarImage().File("etc/shared", "from b").File("etc/b", "b"));
  Save("B.tgz", TarImage().File("etc/shared", "from B"));
  Save("a.tgz", TarImage().File("etc/shared", "from a").File("etc/a", "a"));
  EXPECT_EQ(BootAnd([] {
              return Content("/etc/shared") + ", " + Content("/etc/a") + ", " + Content("/etc/b") +
                     ", " + Origin("/etc/shared") + ", " + Origin("/etc/a") + ", " +
                     Origin("/etc/b");
            }),
            "from b, a, b, b.tgz, a.tgz, b.tgz");
}

TEST_F(Boot, GivesEveryFileItsFirstLabel) {
  scratch.Write("etc/own/file", "here before");
  Save("disk.tgz", TarImage().Directory("usr").File("usr/program", "code", 0555));
  for (const std::string path : {"/", "/usr", "/usr/program", "/etc", "/etc/own", "/etc/own/file",
                                 "/tardisks", "/tardisks/disk.tgz"}) {
    EXPECT_EQ(BootAnd([&] { return Label(path); }), "unlabeled") << path;
  }
}

TEST_F(Boot, LeavesTheRunningSystemWithoutLabel) {
  scratch.Write("run/service/file", "state");
  scratch.Write("usr/run/file", "only a name");
  Save("disk.tgz", TarImage().File("file", "text"));
  EXPECT_EQ(BootAnd([] { return Label("/run/service/file"); }), std::strerror(ENODATA));
  EXPECT_EQ(BootAnd([] { return Label("/run"); }), std::strerror(ENODATA));
  EXPECT_EQ(BootAnd([] { return Label("/usr/run/file"); }), "unlabeled");
}

TEST_F(Boot, LabelsTreesThatNoPathReaches) {
  scratch.Write("deep/file", "text");
  ASSERT_EQ(scratch.RunInside([]() -> std::string {
    // Twice what a path can hold.
    std::filesystem::current_path("/deep");
    const std::string name(200, 'd');
    for (int level = 0; level < 40; ++level) {
      if (mkdir(name.c_str(), 0755) != 0 || chdir(name.c_str()) != 0) return std::strerror(errno);
    }
    close(open("bottom", O_CREAT | O_WRONLY, 0600));
    return "made";
  }),
            "made");
  EXPECT_EQ(BootAnd([]() -> std::string {
              std::filesystem::current_path("/deep");
              const std::string name(200, 'd');
              for (int level = 0; level < 40; ++level) {
                if (chdir(name.c_str()) != 0) return std::strerror(errno);
              }
              return Label("bottom");
            }),
            "unlabeled");
}

// Sets or clears the flag that keeps even the superuser from changing the file at `path`.
bool SetImmutable(const std::filesystem::path& path, bool immutable) {
  const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  int flags = 0;
  bool done = ioctl(file, FS_IOC_GETFLAGS, &flags) == 0;
  flags = immutable ? flags | FS_IMMUTABLE_FL : flags & ~FS_IMMUTABLE_FL;
  done = done && ioctl(file, FS_IOC_SETFLAGS, &flags) == 0;
  close(file);
  return done;
}

TEST_F(Boot, LabelsAllOtherFilesBeforeItFails) {
  for (const char* path : {"a/file", "b/fixed", "b/other", "c/file"}) scratch.Write(path, "text");
  const std::filesystem::path fixed = scratch.Root() / "b/fixed";
  if (!SetImmutable(fixed, true)) GTEST_SKIP() << "no file can be made immutable here";
  const std::string message = BootAnd();
  SetImmutable(fixed, false);
  EXPECT_EQ(message, "Unable to give 1 file its first label: /b/fixed: Operation not permitted");
  EXPECT_EQ(scratch.RunInside(
                [] { return Label("/a/file") + " " + Label("/b/other") + " " + Label("/c/file"); }),
            "unlabeled unlabeled unlabeled");
}

TEST_F(Boot, LabelsNothingThroughLinks) {
  scratch.Write("../outside/file", "text");
  std::filesystem::create_symlink(scratch.Directory() / "outside", scratch.Root() / "link");
  ASSERT_EQ(BootAnd(), "well");
  scratch.Write("probe", "");
  EXPECT_EQ(scratch.RunBeneath([] { return Label("../outside/file"); }), std::strerror(ENODATA));
}

TEST_F(Boot, GivesFirstLabelInPlaceOfAnyOther) {
  Save("disk.tgz", TarImage().File("other", "text"));
  scratch.Write("file", "here before");
  EXPECT_EQ(BootAnd([] {
              TeskAccessInterfaceImpl().AddLabels({"mine"}, TESKACCESS_LABEL_OBJECT);
              const unsigned int id =
                  TeskAccessInterfaceImpl().LookupLabel("mine", TESKACCESS_LABEL_OBJECT);
              Zorvan::Kernel::SetXattr("/file", "zorvan.security", &id, sizeof id, 0);
              return Label("/file");
            }),
            "mine");
  EXPECT_EQ(BootAnd([] { return Label("/file"); }), "unlabeled");
}

TEST_F(Boot, TakesOffTheLabelsOfOlderVersions) {
  static constexpr char kFormer[] = "security.zorvan";
  const std::uint32_t id = 7;
  scratch.Write("old/file", "here before");
  for (const char* path : {"old", "old/file"}) {
    if (setxattr((scratch.Root() / path).c_str(), kFormer, &id, sizeof id, 0) != 0) {
      GTEST_SKIP() << "this user may not write system attributes";
    }
  }
  EXPECT_EQ(BootAnd([] {
              std::string seen;
              for (const char* path : {"/old", "/old/file"}) {
                seen += lgetxattr(path, kFormer, nullptr, 0) < 0 ? "gone " : "there ";
                seen += Label(path) + " ";
              }
              return seen;
            }),
            "gone unlabeled gone unlabeled ");
}

TEST_F(Boot, StartsFromEmptyState) {
  Save("old.tgz", TarImage().File("file", "text"));
  ASSERT_EQ(BootAnd([] {
              TeskAccessInterfaceImpl access;
              access.AddLabels({"mine"}, TESKACCESS_LABEL_OBJECT);
              access.CreateDomain("mineDom", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
              return Origin("/file");
            }),
            "old.tgz");
  std::filesystem::remove(scratch.Root() / "tardisks" / "old.tgz");
  EXPECT_EQ(BootAnd([] {
              TeskAccessInterfaceImpl access;
              unsigned int id = 0;
              return std::to_string(access.LookupLabel("mine", TESKACCESS_LABEL_OBJECT)) +
                     (access.FindDomain("mineDom", &id) ? " found" : " none") + Origin("/file");
            }),
            "1 none");
}

TEST_F(Boot, MayBeDoneAgain) {
  Save("disk.tgz", TarImage()
                       .Directory("usr", 0555)
                       .File("usr/program", "code", 0555)
                       .SymbolicLink("usr/link", "program")
                       .HardLink("usr/same", "usr/program"));
  for (int boot = 1; boot <= 2; ++boot) {
    EXPECT_EQ(
        BootAnd([] { return Content("/usr/same") + Label("/usr/same") + Origin("/usr/link"); }),
        "codeunlabeleddisk.tgz");
  }
}

TEST_F(Boot, ReturnsToTheWorkingDirectory) {
  std::filesystem::create_directory(scratch.Root() / "here");
  EXPECT_EQ(scratch.RunInside([this] {
    std::filesystem::current_path("/here");
    LinuxHost::StartPolicy(LinuxHost::AssembleRoot(rules));
    return std::filesystem::current_path().string();
  }),
            "/here");
}

TEST_F(Boot, PassesOverWhatIsNoRegularFile) {
  std::filesystem::create_directory(scratch.Root() / "tardisks" / "a");
  std::filesystem::create_symlink("b.tgz", scratch.Root() / "tardisks" / "c");
  Save("b.tgz", TarImage().File("file", "text"));
  EXPECT_EQ(BootAnd([] { return Origin("/file"); }), "b.tgz");
}

TEST_F(Boot, ChangesNothingForTheTardiskThatIsRefused) {
  Save("a.tgz", TarImage().File("first", "text"));
  Save("b.tgz", TarImage().File("../out", "text"));
  Save("c.tgz", TarImage().File("last", "text"));
  EXPECT_EQ(BootAnd(), "Unable to unpack tardisk b.tgz: ../out: Path contains '..'");
  EXPECT_FALSE(std::filesystem::exists(scratch.Root() / "first"));
  EXPECT_FALSE(std::filesystem::exists(scratch.Root() / "last"));
}

TEST_F(Boot, KeepsWhatIsInstalledWhenItFails) {
  Save("a.tgz", TarImage().File("file", "text"));
  ASSERT_EQ(BootAnd([] {
              TeskAccessInterfaceImpl().AddLabels({"mine"}, TESKACCESS_LABEL_OBJECT);
              return Origin("/file");
            }),
            "a.tgz");
  scratch.Write("tardisks/b.tgz", "no archive");
  ASSERT_EQ(BootAnd(), "Unable to unpack tardisk b.tgz: Unrecognized archive format");
  EXPECT_EQ(scratch.RunInside([] {
    const bool found = TeskAccessInterfaceImpl().LookupLabel("mine", TESKACCESS_LABEL_OBJECT) != 1;
    return std::string(found ? "still there" : "gone");
  }),
            "still there");
}

TEST_F(Boot, NeedsTheTardiskDirectory) {
  std::filesystem::remove(scratch.Root() / "tardisks");
  EXPECT_EQ(BootAnd(), "Unable to list the tardisks in /tardisks: No such file or directory");
}

TEST_F(Boot, CountsNoSettingAsApplied) {
  const auto apply = [] {
    LinuxHost::StoreWantedEnforcement("appDom", "permissive");
    OrinConfigStore::SetBootStatus({"domain_settings", "security", "orin", "appDom"}, true);
    return std::string(LinuxHost::WasEnforcementApplied("appDom") ? "applied" : "not applied");
  };
  EXPECT_EQ(scratch.RunInside(apply), "applied");
  EXPECT_EQ(BootAnd([] {
              return *LinuxHost::FindWantedEnforcement("appDom") +
                     (LinuxHost::WasEnforcementApplied("appDom") ? " applied" : " not applied");
            }),
            "permissive not applied");
}

TEST_F(Boot, LogsEachTardisk) {
  Save("a.tgz", TarImage().File("file", "text"));
  Save("b.tgz", TarImage().File("file", "text"));
  EXPECT_EQ(BootAnd([] { return Content("/run/secpolicy/kernel.log"); }),
            "[INFO] Unpacked tardisk /tardisks/a.tgz\n"
            "[INFO] Unpacked tardisk /tardisks/b.tgz\n");
}

// Sysinfo knows what a boot recorded.

TEST_F(Boot, RecordsNoOriginForOtherFiles) {
  Save("disk.tgz", TarImage().File("file", "text"));
  scratch.Write("own", "text");
  EXPECT_EQ(BootAnd([] { return "(" + Origin("/own") + ")"; }), "()");
}

TEST_F(Boot, ForgetsTheOriginOfAnInodeThatIsUsedAgain) {
  Save("disk.tgz", TarImage().File("file", "text"));
  EXPECT_EQ(BootAnd([] {
              unlink("/file");
              // Many at once, so that one of them has the number again.
              std::string origins;
              for (int count = 0; count < 50; ++count) {
                const std::string path = "/file" + std::to_string(count);
                close(open(path.c_str(), O_CREAT | O_WRONLY, 0600));
                origins += Origin(path);
              }
              close(open("/file", O_CREAT | O_WRONLY, 0600));
              return "(" + origins + Origin("/file") + ")";
            }),
            "()");
}

TEST_F(Boot, FillsTheStatisticsOfAnInode) {
  Save("disk.tgz", TarImage().File("file", "1234567", 0640));
  EXPECT_EQ(BootAnd([] {
              struct stat status {};
              stat("/file", &status);
              struct {
                unsigned long inode, size, blocks;
                unsigned int mode, links, owner;
                char rest[512];
              } record;
              TeskCtl::Util::Sysinfo node(TeskCtl::Util::KSI_NODE_system_kelpfs_inodes_stats);
              node.AddInstancePath(status.st_ino);
              node.Get(&record, 548);
              const bool same = record.inode == status.st_ino && record.size == 7 &&
                                record.blocks == static_cast<unsigned long>(status.st_blocks) &&
                                record.mode == status.st_mode && record.links == 1 &&
                                record.owner == status.st_uid;
              return std::string(same ? "same" : "different");
            }),
            "same");
}

TEST_F(Boot, SysinfoRefusesRecordOfAnotherSize) {
  EXPECT_EQ(scratch.RunInside([]() -> std::string {
    char record[548];
    TeskCtl::Util::Sysinfo node(TeskCtl::Util::KSI_NODE_system_kelpfs_inodes_stats);
    node.AddInstancePath(1);
    node.Get(record, 547);
    return "well";
  }),
            "The record of an inode has 548 bytes, not 547");
}

TEST_F(Boot, SysinfoNeedsAnInstance) {
  EXPECT_EQ(scratch.RunInside([]() -> std::string {
    char record[548];
    TeskCtl::Util::Sysinfo(TeskCtl::Util::KSI_NODE_system_kelpfs_inodes_stats)
        .Get(record, sizeof record);
    return "well";
  }),
            "No instance of the sysinfo node was selected");
}

TEST_F(Boot, SysinfoRefusesUnknownNode) {
  EXPECT_EQ(scratch.RunInside([]() -> std::string {
    TeskCtl::Util::Sysinfo(static_cast<TeskCtl::Util::SysinfoNode>(2));
    return "well";
  }),
            "Unknown sysinfo node 2");
}

}  // namespace
}  // namespace LinuxHostTest
