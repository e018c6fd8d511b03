#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <climits>
#include <set>

#include "host/linux/boot.h"
#include "host/linux/security_attribute.h"
#include "scratch_root.h"
#include "tar_image.h"

namespace LinuxHostTest {
namespace {

// Unpacks the tardisk "disk.tgz", which lies beside the root, and looks at what it did.
class UnpackTardisk : public ::testing::Test {
 protected:
  // "unpacked", or the message of the failure.
  std::string Unpack(const TarImage& image) { return UnpackBytes(image.Bytes()); }

  std::string UnpackBytes(const std::string& bytes) {
    scratch.Write("../disk.tgz", bytes);
    return scratch.RunBeneath([] {
      std::vector<LinuxHost::InodeOrigin> origins;
      LinuxHost::UnpackTardisk("../disk.tgz", LinuxHost::LabelAttribute(), origins);
      return std::string("unpacked");
    });
  }

  void SetUp() override { scratch.Write("../victim", "untouched"); }

  // Whatever an archive tried, nothing beside the root has changed.
  void TearDown() override {
    EXPECT_EQ(Content(Victim()), "untouched");
    struct stat status {};
    ASSERT_EQ(stat(Victim().c_str(), &status), 0);
    EXPECT_EQ(status.st_nlink, 1U);
    std::set<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(scratch.Directory())) {
      names.insert(entry.path().filename());
    }
    names.erase("state");
    EXPECT_EQ(names, (std::set<std::string>{"disk.tgz", "root", "victim"}));
  }

  std::filesystem::path Victim() const { return scratch.Directory() / "victim"; }
  std::filesystem::path In(const std::string& path) const { return scratch.Root() / path; }
  bool Exists(const std::string& path) const {
    return std::filesystem::exists(std::filesystem::symlink_status(In(path)));
  }

  ScratchRoot scratch;
};

TEST_F(UnpackTardisk, BringsFilesDirectoriesLinksAndFifos) {
  TarImage image;
  image.Directory("usr/", 0750)
      .File("usr/program", "code", 0755)
      .SymbolicLink("usr/link", "program")
      .HardLink("usr/same", "usr/program")
      .Fifo("usr/pipe")
      .File("made/on/the/way", "deep");
  ASSERT_EQ(Unpack(image), "unpacked");

  EXPECT_EQ(Content(In("usr/program")), "code");
  EXPECT_EQ(Content(In("made/on/the/way")), "deep");
  EXPECT_EQ(std::filesystem::read_symlink(In("usr/link")), "program");
  struct stat status {};
  ASSERT_EQ(stat(In("usr").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode, S_IFDIR | 0750U);
  ASSERT_EQ(stat(In("usr/program").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode, S_IFREG | 0755U);
  const ino_t program = status.st_ino;
  ASSERT_EQ(stat(In("usr/same").c_str(), &status), 0);
  EXPECT_EQ(status.st_ino, program);
  ASSERT_EQ(stat(In("usr/pipe").c_str(), &status), 0);
  EXPECT_TRUE(S_ISFIFO(status.st_mode));
}

TEST_F(UnpackTardisk, TellsWhereEachInodeCameFrom) {
  TarImage image;
  image.Directory("etc").File("./etc/file", "text").SymbolicLink("etc/link", "file");
  scratch.Write("../disk.tgz", image.Bytes());
  const std::string told = scratch.RunBeneath([] {
    std::vector<LinuxHost::InodeOrigin> origins;
    LinuxHost::UnpackTardisk("../disk.tgz", LinuxHost::LabelAttribute(), origins);
    std::string lines;
    for (const LinuxHost::InodeOrigin& origin : origins) {
      struct stat status {};
      const bool same = lstat(("." + origin.path).c_str(), &status) == 0 &&
                        status.st_ino == origin.inode && status.st_dev == origin.device;
      lines += origin.tardisk + " " + origin.path + (same ? " same\n" : " other\n");
    }
    return lines;
  });
  EXPECT_EQ(told,
            "disk.tgz /etc same\n"
            "disk.tgz /etc/file same\n"
            "disk.tgz /etc/link same\n");
}

TEST_F(UnpackTardisk, ReplacesWhatIsThere) {
  scratch.Write("file", "old");
  std::filesystem::create_hard_link(In("file"), In("other name"));
  TarImage image;
  image.File("file", "new");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(Content(In("file")), "new");
  EXPECT_EQ(Content(In("other name")), "old");
}

TEST_F(UnpackTardisk, LeavesTheRootItselfAlone) {
  std::filesystem::permissions(scratch.Root(), std::filesystem::perms(0711));
  TarImage image;
  image.Directory("./", 0777).File("./file", "text");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(Content(In("file")), "text");
  EXPECT_EQ(std::filesystem::status(scratch.Root()).permissions(), std::filesystem::perms(0711));
}

TEST_F(UnpackTardisk, KeepsNamesThatAreNotText) {
  const std::string name = "caf\xc3\xa9 \xff\n";
  TarImage image;
  image.File(name, "plain").Extended("path", "extended " + name).File("short", "extended");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(Content(In(name)), "plain");
  EXPECT_EQ(Content(In("extended " + name)), "extended");
}

TEST_F(UnpackTardisk, RefusesAbsolutePath) {
  TarImage image;
  image.File(Victim(), "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: " + Victim().string() + ": Path is absolute");
}

TEST_F(UnpackTardisk, RefusesParentDirectory) {
  TarImage image;
  image.File("../victim", "owned");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: ../victim: Path contains '..'");
}

TEST_F(UnpackTardisk, RefusesParentDirectoryInTheMiddle) {
  TarImage image;
  image.File("etc/../../victim", "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: etc/../../victim: Path contains '..'");
}

TEST_F(UnpackTardisk, RefusesWayThroughItsOwnLink) {
  TarImage image;
  image.SymbolicLink("out", "..").File("out/victim", "owned");
  EXPECT_EQ(
      Unpack(image),
      "Unable to unpack tardisk disk.tgz: out/victim: Cannot extract through symlink out/victim");
}

TEST_F(UnpackTardisk, RefusesWayThroughLinkThatWasThere) {
  std::filesystem::create_directory(In("real"));
  std::filesystem::create_symlink(scratch.Directory(), In("real/out"));
  TarImage image;
  image.File("real/out/victim", "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: real/out/victim: Cannot extract through symlink "
            "real/out/victim");
}

TEST_F(UnpackTardisk, RefusesDirectoryThroughLink) {
  TarImage image;
  image.SymbolicLink("out", "..").Directory("out/made");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: out/made: Cannot extract through symlink out/made");
}

TEST_F(UnpackTardisk, ReplacesLinkInLastPlace) {
  std::filesystem::create_symlink(Victim(), In("there"));
  TarImage image;
  image.File("there", "new").SymbolicLink("own", "../victim").File("own", "new");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_TRUE(std::filesystem::is_regular_file(std::filesystem::symlink_status(In("there"))));
  EXPECT_TRUE(std::filesystem::is_regular_file(std::filesystem::symlink_status(In("own"))));
}

TEST_F(UnpackTardisk, ReplacesLinkToDirectoryByDirectory) {
  std::filesystem::create_symlink(scratch.Directory(), In("out"));
  TarImage image;
  image.Directory("out/", 0700).File("out/victim", "inside");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_TRUE(std::filesystem::is_directory(std::filesystem::symlink_status(In("out"))));
  EXPECT_EQ(Content(In("out/victim")), "inside");
}

// The mode of a directory is set at the end; by then its name may lead elsewhere.
TEST_F(UnpackTardisk, SetsNoModeThroughDirectoryThatBecameLink) {
  std::filesystem::permissions(scratch.Directory(), std::filesystem::perms(0700));
  TarImage image;
  image.Directory("turns", 0777).SymbolicLink("turns", "..");
  EXPECT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(std::filesystem::status(scratch.Directory()).permissions(),
            std::filesystem::perms(0700));
}

TEST_F(UnpackTardisk, LabelsNothingBehindLinkWhoseNameEndsInSlash) {
  for (const char* name : {"out/", "out/.", "out//./"}) {
    TarImage image;
    image.SymbolicLink(name, "..");
    scratch.Write("../disk.tgz", image.Bytes());
    EXPECT_EQ(scratch.RunBeneath([] {
      std::vector<LinuxHost::InodeOrigin> origins;
      LinuxHost::UnpackTardisk("../disk.tgz", LinuxHost::LabelAttribute(), origins);
      struct stat link {};
      const bool same = lstat("out", &link) == 0 && origins.size() == 1 &&
                        origins[0].inode == link.st_ino && origins[0].path == "/out";
      return std::string(same ? "the link itself" : "another file");
    }),
              "the link itself")
        << name;
    EXPECT_LT(listxattr(scratch.Directory().c_str(), nullptr, 0), 1) << name;
  }
}

TEST_F(UnpackTardisk, RefusesHardLinkOutOfTheRoot) {
  TarImage image;
  image.HardLink("mine", "../victim");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: mine: It is a hard link to ../victim, which this "
            "tardisk did not bring");
  EXPECT_FALSE(Exists("mine"));
}

TEST_F(UnpackTardisk, RefusesHardLinkToAbsolutePath) {
  TarImage image;
  image.HardLink("mine", Victim(), "owned");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: mine: It is a hard link to " +
                               Victim().string() + ", which this tardisk did not bring");
  EXPECT_FALSE(Exists("mine"));
}

TEST_F(UnpackTardisk, RefusesHardLinkThroughLink) {
  TarImage image;
  image.SymbolicLink("out", "..").HardLink("mine", "out/victim", "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: mine: It is a hard link to out/victim, which this "
            "tardisk did not bring");
  EXPECT_FALSE(Exists("mine"));
}

TEST_F(UnpackTardisk, RefusesHardLinkToFileOfSomebodyElse) {
  scratch.Write("etc/secret", "secret");
  TarImage image;
  image.HardLink("mine", "etc/secret", "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: mine: It is a hard link to etc/secret, which this "
            "tardisk did not bring");
  EXPECT_EQ(Content(In("etc/secret")), "secret");
}

// A hard link may carry content, and the link that it names may lead out.
TEST_F(UnpackTardisk, WritesNothingThroughHardLinkToLink) {
  TarImage image;
  image.SymbolicLink("out", "../victim").Extended("comment", "").HardLink("mine", "out", "owned");
  EXPECT_EQ(Unpack(image), "unpacked");
}

TEST_F(UnpackTardisk, RefusesCharacterDevice) {
  TarImage image;
  image.CharacterDevice("memory");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: memory: Devices and sockets are made by the "
            "running system");
  EXPECT_FALSE(Exists("memory"));
}

TEST_F(UnpackTardisk, RefusesBlockDevice) {
  TarImage image;
  image.BlockDevice("drive");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: drive: Devices and sockets are made by the "
            "running system");
  EXPECT_FALSE(Exists("drive"));
}

TEST_F(UnpackTardisk, RefusesTooLongComponent) {
  const std::string name(NAME_MAX + 1, 'n');
  TarImage image;
  image.Extended("path", name).File("short", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: " + name + ": Could not stat " +
                               name + ": File name too long");
  TarImage fitting;
  fitting.Extended("path", name.substr(1)).File("short", "text");
  EXPECT_EQ(Unpack(fitting), "unpacked");
}

TEST_F(UnpackTardisk, RefusesTooLongPath) {
  std::string name;
  while (name.size() < PATH_MAX) name += "component/";
  name += "file";
  TarImage image;
  image.Extended("path", name).File("short", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: " + name + ": Its name is too long");
  EXPECT_FALSE(Exists("component"));
}

TEST_F(UnpackTardisk, RefusesEntryWithoutName) {
  TarImage image;
  image.File("", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: an entry: It has no name");
}

TEST_F(UnpackTardisk, RefusesFileAsTheRoot) {
  TarImage image;
  image.File("./.", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: ./.: It is the root");
}

TEST_F(UnpackTardisk, RefusesWhatBelongsToTheRunningSystem) {
  for (const std::string path : {"dev/file", "./proc//file", "run/secpolicy/host.db", "sys"}) {
    TarImage image;
    image.File(path, "text");
    EXPECT_EQ(Unpack(image),
              "Unable to unpack tardisk disk.tgz: " + path + ": It belongs to the running system");
  }
}

TEST_F(UnpackTardisk, MakesMissingDirectoriesOfTheRunningSystem) {
  std::filesystem::permissions(In("run"), std::filesystem::perms(0711));
  TarImage image;
  image.Directory("proc/", 0555).Directory("run/", 0777);
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(std::filesystem::status(In("proc")).permissions(), std::filesystem::perms(0555));
  EXPECT_EQ(std::filesystem::status(In("run")).permissions(), std::filesystem::perms(0711));
}

TEST_F(UnpackTardisk, RefusesAnotherImage) {
  TarImage image;
  image.File("tardisks/more.tgz", "text");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: tardisks/more.tgz: It belongs to the tardisk "
            "images");
}

TEST_F(UnpackTardisk, StopsAtFirstBadEntry) {
  TarImage image;
  image.File("first", "text").File("../victim", "owned").File("last", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: ../victim: Path contains '..'");
  EXPECT_TRUE(Exists("first"));
  EXPECT_FALSE(Exists("last"));
}

TEST_F(UnpackTardisk, TakesNoExtendedAttributeFromTheArchive) {
  TarImage image;
  image.Extended("SCHILY.xattr.user.other", "value").File("file", "text");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(getxattr(In("file").c_str(), "user.other", nullptr, 0), -1);
}

TEST_F(UnpackTardisk, RefusesWhatIsNoTarArchive) {
  EXPECT_EQ(UnpackBytes("#mtree\n./copy type=file contents=/etc/hostname\n"),
            "Unable to unpack tardisk disk.tgz: Unrecognized archive format");
  EXPECT_EQ(UnpackBytes("no archive at all"),
            "Unable to unpack tardisk disk.tgz: Unrecognized archive format");
  EXPECT_EQ(UnpackBytes(""), "Unable to unpack tardisk disk.tgz: Unrecognized archive format");
}

TEST_F(UnpackTardisk, RefusesArchiveThatEndsEarly) {
  TarImage image;
  image.File("file", std::string(4096, 'x'));
  EXPECT_EQ(UnpackBytes(image.Bytes().substr(0, 1024)),
            "Unable to unpack tardisk disk.tgz: file: Truncated tar archive");
}

TEST_F(UnpackTardisk, RefusesLinkInPlaceOfImage) {
  TarImage image;
  image.File("file", "text");
  std::filesystem::create_symlink("../disk.tgz", In("image"));
  scratch.Write("../disk.tgz", image.Bytes());
  EXPECT_EQ(scratch.RunBeneath([] {
    std::vector<LinuxHost::InodeOrigin> origins;
    LinuxHost::UnpackTardisk("image", LinuxHost::LabelAttribute(), origins);
    return std::string("unpacked");
  }),
            "Unable to unpack tardisk image: Too many levels of symbolic links");
}

}  // namespace
}  // namespace LinuxHostTest
