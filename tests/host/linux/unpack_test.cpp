// Archives that lead out of the root, that are damaged, or that bring what is not theirs; and what
// a good one leaves on the disk.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <climits>
#include <cstdlib>
#include <set>

#include "host/linux/files/security_attribute.h"
#include "host/linux/operation/boot.h"
#include "scratch_root.h"
#include "tar_image.h"

namespace LinuxHostTest {
namespace {

using ::testing::StartsWith;

// Unpacks the tardisk "disk.tgz", which lies beside the root, and looks at what it did.
class UnpackTardisks : public ::testing::Test {
 protected:
  // "unpacked", or the message of the failure.
  std::string Unpack(const TarImage& image) { return UnpackBytes(image.Bytes()); }

  std::string UnpackBytes(const std::string& bytes) {
    scratch.Write("../disk.tgz", bytes);
    return scratch.RunBeneath([this] {
      UnpackImage("../disk.tgz");
      return std::string("unpacked");
    });
  }

  LinuxHost::AssembledRoot UnpackImage(const std::string& image) const {
    LinuxHost::AssembledRoot root;
    root.labelAttribute = LinuxHost::LabelAttribute();
    LinuxHost::UnpackTardisks({image}, rules, root);
    return root;
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
  LinuxHost::TardiskRules rules{.policyRoot = "/etc/zorvan/secpolicy", .policyTardisks = {}};
};

TEST_F(UnpackTardisks, BringsFilesDirectoriesLinksAndFifos) {
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

TEST_F(UnpackTardisks, TellsWhereEachInodeCameFrom) {
  TarImage image;
  image.Directory("etc").File("./etc/file", "text").SymbolicLink("etc/link", "file");
  scratch.Write("../disk.tgz", image.Bytes());
  const std::string told = scratch.RunBeneath([this] {
    const std::vector<LinuxHost::InodeOrigin> origins = UnpackImage("../disk.tgz").origins;
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

TEST_F(UnpackTardisks, ReplacesWhatIsThere) {
  scratch.Write("file", "old");
  std::filesystem::create_hard_link(In("file"), In("other name"));
  TarImage image;
  image.File("file", "new");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(Content(In("file")), "new");
  EXPECT_EQ(Content(In("other name")), "old");
}

TEST_F(UnpackTardisks, LeavesTheRootItselfAlone) {
  std::filesystem::permissions(scratch.Root(), std::filesystem::perms(0711));
  TarImage image;
  image.Directory("./", 0777).File("./file", "text");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(Content(In("file")), "text");
  EXPECT_EQ(std::filesystem::status(scratch.Root()).permissions(), std::filesystem::perms(0711));
}

TEST_F(UnpackTardisks, KeepsNamesThatAreNotText) {
  const std::string name = "caf\xc3\xa9 \xff\n";
  TarImage image;
  image.File(name, "plain").Extended("path", "extended " + name).File("short", "extended");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(Content(In(name)), "plain");
  EXPECT_EQ(Content(In("extended " + name)), "extended");
}

TEST_F(UnpackTardisks, RefusesAbsolutePath) {
  TarImage image;
  image.File(Victim(), "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: " + Victim().string() + ": Path is absolute");
}

TEST_F(UnpackTardisks, RefusesAbsolutePathWhereverItLeads) {
  TarImage image;
  image.File("/proc/version", "owned");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: /proc/version: Path is absolute");
}

TEST_F(UnpackTardisks, RefusesParentDirectory) {
  TarImage image;
  image.File("../victim", "owned");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: ../victim: Path contains '..'");
}

TEST_F(UnpackTardisks, RefusesParentDirectoryInTheMiddle) {
  TarImage image;
  image.File("etc/../../victim", "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: etc/../../victim: Path contains '..'");
}

TEST_F(UnpackTardisks, RefusesWayThroughItsOwnLink) {
  TarImage image;
  image.SymbolicLink("out", "..").File("out/victim", "owned");
  EXPECT_EQ(
      Unpack(image),
      "Unable to unpack tardisk disk.tgz: out/victim: Cannot extract through symlink out/victim");
}

TEST_F(UnpackTardisks, RefusesWayThroughLinkThatWasThere) {
  std::filesystem::create_directory(In("real"));
  std::filesystem::create_symlink(scratch.Directory(), In("real/out"));
  TarImage image;
  image.File("real/out/victim", "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: real/out/victim: Cannot extract through symlink "
            "real/out/victim");
}

TEST_F(UnpackTardisks, RefusesDirectoryThroughLink) {
  TarImage image;
  image.SymbolicLink("out", "..").Directory("out/made");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: out/made: Cannot extract through symlink out/made");
}

TEST_F(UnpackTardisks, ReplacesLinkInLastPlace) {
  std::filesystem::create_symlink(Victim(), In("there"));
  TarImage image;
  image.File("there", "new").SymbolicLink("own", "../victim").File("own", "new");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_TRUE(std::filesystem::is_regular_file(std::filesystem::symlink_status(In("there"))));
  EXPECT_TRUE(std::filesystem::is_regular_file(std::filesystem::symlink_status(In("own"))));
}

TEST_F(UnpackTardisks, ReplacesLinkToDirectoryByDirectory) {
  std::filesystem::create_symlink(scratch.Directory(), In("out"));
  TarImage image;
  image.Directory("out/", 0700).File("out/victim", "inside");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_TRUE(std::filesystem::is_directory(std::filesystem::symlink_status(In("out"))));
  EXPECT_EQ(Content(In("out/victim")), "inside");
}

// The mode of a directory is set at the end; by then its name would lead elsewhere.
TEST_F(UnpackTardisks, RefusesLinkInPlaceOfDirectory) {
  std::filesystem::permissions(scratch.Directory(), std::filesystem::perms(0700));
  TarImage image;
  image.Directory("turns", 0777).SymbolicLink("turns", "..");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: turns: There is a directory");
  EXPECT_FALSE(Exists("turns"));
}

TEST_F(UnpackTardisks, RefusesFileInPlaceOfDirectoryThatWasThere) {
  std::filesystem::create_directory(In("sub"));
  TarImage image;
  image.File("sub", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: sub: There is a directory");
  EXPECT_TRUE(std::filesystem::is_directory(In("sub")));
}

TEST_F(UnpackTardisks, RefusesWayThroughFile) {
  scratch.Write("there", "old");
  TarImage image;
  image.File("there/below", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: there/below: there is no directory");
  TarImage own;
  own.File("own", "text").File("own/below", "text");
  EXPECT_EQ(Unpack(own), "Unable to unpack tardisk disk.tgz: own/below: own is no directory");
  EXPECT_EQ(Content(In("there")), "old");
  EXPECT_FALSE(Exists("own"));
}

TEST_F(UnpackTardisks, PassesOverHardLinkToItself) {
  TarImage image;
  image.File("file", "text").HardLink("./file", "file");
  EXPECT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(Content(In("file")), "text");
}

TEST_F(UnpackTardisks, LabelsNothingBehindLinkWhoseNameEndsInSlash) {
  for (const char* name : {"out/", "out/.", "out//./"}) {
    TarImage image;
    image.SymbolicLink(name, "..");
    scratch.Write("../disk.tgz", image.Bytes());
    EXPECT_EQ(scratch.RunBeneath([this] {
      const std::vector<LinuxHost::InodeOrigin> origins = UnpackImage("../disk.tgz").origins;
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

TEST_F(UnpackTardisks, RefusesHardLinkOutOfTheRoot) {
  TarImage image;
  image.HardLink("mine", "../victim");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: mine: It is a hard link to ../victim, which this "
            "tardisk did not bring");
  EXPECT_FALSE(Exists("mine"));
}

TEST_F(UnpackTardisks, RefusesHardLinkToAbsolutePath) {
  TarImage image;
  image.HardLink("mine", Victim(), "owned");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: mine: It is a hard link to " +
                               Victim().string() + ", which this tardisk did not bring");
  EXPECT_FALSE(Exists("mine"));
}

TEST_F(UnpackTardisks, RefusesHardLinkThroughLink) {
  TarImage image;
  image.SymbolicLink("out", "..").HardLink("mine", "out/victim", "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: mine: It is a hard link to out/victim, which this "
            "tardisk did not bring");
  EXPECT_FALSE(Exists("mine"));
}

TEST_F(UnpackTardisks, RefusesHardLinkToFileOfSomebodyElse) {
  scratch.Write("etc/secret", "secret");
  TarImage image;
  image.HardLink("mine", "etc/secret", "owned");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: mine: It is a hard link to etc/secret, which this "
            "tardisk did not bring");
  EXPECT_EQ(Content(In("etc/secret")), "secret");
}

// A hard link may carry content, and the link that it names may lead out.
TEST_F(UnpackTardisks, WritesNothingThroughHardLinkToLink) {
  TarImage image;
  image.SymbolicLink("out", "../victim").Extended("comment", "").HardLink("mine", "out", "owned");
  EXPECT_EQ(Unpack(image), "unpacked");
}

// What is there already at its place is compared with it.
TEST_F(UnpackTardisks, RefusesSymbolicLinkToNothing) {
  std::filesystem::create_symlink("target", In("there"));
  for (const char* name : {"missing", "there"}) {
    TarImage image;
    image.SymbolicLink(name, "");
    EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: " + std::string(name) +
                                 ": It is a symbolic link to nothing");
  }
}

TEST_F(UnpackTardisks, RefusesCharacterDevice) {
  TarImage image;
  image.CharacterDevice("memory");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: memory: Devices and sockets are made by the "
            "running system");
  EXPECT_FALSE(Exists("memory"));
}

TEST_F(UnpackTardisks, RefusesBlockDevice) {
  TarImage image;
  image.BlockDevice("drive");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: drive: Devices and sockets are made by the "
            "running system");
  EXPECT_FALSE(Exists("drive"));
}

// Cut to the 32 bits of the system, the first of them would be the superuser.
TEST_F(UnpackTardisks, RefusesOwnersThatNoSystemHas) {
  for (const char* whose : {"uid", "gid"}) {
    for (const char* number : {"4294967296", "4294967295", "-1"}) {
      TarImage image;
      image.Extended(whose, number).File("program", "code", 04755);
      EXPECT_EQ(
          Unpack(image),
          "Unable to unpack tardisk disk.tgz: program: No user and no group can have the number " +
              std::string(number))
          << whose;
      EXPECT_FALSE(Exists("program"));
    }
  }
}

TEST_F(UnpackTardisks, GivesFilesToTheLastOwnerThereIs) {
  TarImage image;
  image.Extended("uid", "4294967294").Extended("gid", "4294967294").File("program", "code");
  EXPECT_EQ(Unpack(image), "unpacked");
  struct stat status {};
  ASSERT_EQ(stat(In("program").c_str(), &status), 0);
  const bool keepsOwners = geteuid() == 0;
  EXPECT_EQ(status.st_uid, keepsOwners ? 4294967294U : geteuid());
  EXPECT_EQ(status.st_gid, keepsOwners ? 4294967294U : getegid());
}

TEST_F(UnpackTardisks, RefusesTooLongComponent) {
  const std::string name(NAME_MAX + 1, 'n');
  TarImage image;
  image.Extended("path", name).File("short", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: " + name + ": File name too long");
  TarImage fitting;
  fitting.Extended("path", name.substr(1)).File("short", "text");
  EXPECT_EQ(Unpack(fitting), "unpacked");
}

TEST_F(UnpackTardisks, RefusesTooLongPath) {
  std::string name;
  while (name.size() < PATH_MAX) name += "component/";
  name += "file";
  TarImage image;
  image.Extended("path", name).File("short", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: " + name + ": Its name is too long");
  EXPECT_FALSE(Exists("component"));
}

TEST_F(UnpackTardisks, RefusesEntryWithoutName) {
  TarImage image;
  image.File("", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: an entry: It has no name");
}

TEST_F(UnpackTardisks, RefusesFileAsTheRoot) {
  TarImage image;
  image.File("./.", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: ./.: It is the root");
}

TEST_F(UnpackTardisks, RefusesWhatBelongsToTheRunningSystem) {
  for (const std::string path : {"dev/file", "./proc//file", "run/secpolicy/host.db", "sys"}) {
    TarImage image;
    image.File(path, "text");
    EXPECT_EQ(Unpack(image),
              "Unable to unpack tardisk disk.tgz: " + path + ": It belongs to the running system");
  }
}

TEST_F(UnpackTardisks, MakesMissingDirectoriesOfTheRunningSystem) {
  std::filesystem::permissions(In("run"), std::filesystem::perms(0711));
  TarImage image;
  image.Directory("proc/", 0555).Directory("run/", 0777);
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(std::filesystem::status(In("proc")).permissions(), std::filesystem::perms(0555));
  EXPECT_EQ(std::filesystem::status(In("run")).permissions(), std::filesystem::perms(0711));
}

TEST_F(UnpackTardisks, RefusesAnotherImage) {
  TarImage image;
  image.File("tardisks/more.tgz", "text");
  EXPECT_EQ(Unpack(image),
            "Unable to unpack tardisk disk.tgz: tardisks/more.tgz: It belongs to the tardisk "
            "images");
}

TEST_F(UnpackTardisks, UnpacksNothingOfAnImageWithABadEntry) {
  TarImage image;
  image.File("first", "text").File("../victim", "owned").File("last", "text");
  EXPECT_EQ(Unpack(image), "Unable to unpack tardisk disk.tgz: ../victim: Path contains '..'");
  EXPECT_FALSE(Exists("first"));
  EXPECT_FALSE(Exists("last"));
}

TEST_F(UnpackTardisks, TakesNoExtendedAttributeFromTheArchive) {
  TarImage image;
  image.Extended("SCHILY.xattr.user.other", "value").File("file", "text");
  ASSERT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(getxattr(In("file").c_str(), "user.other", nullptr, 0), -1);
}

TEST_F(UnpackTardisks, RefusesWhatIsNoTarArchive) {
  EXPECT_EQ(UnpackBytes("#mtree\n./copy type=file contents=/etc/hostname\n"),
            "Unable to unpack tardisk disk.tgz: Unrecognized archive format");
  EXPECT_EQ(UnpackBytes("no archive at all"),
            "Unable to unpack tardisk disk.tgz: Unrecognized archive format");
  EXPECT_EQ(UnpackBytes(""), "Unable to unpack tardisk disk.tgz: Unrecognized archive format");
}

// ---- What is damaged

const std::string kUnable = "Unable to unpack tardisk disk.tgz: ";
const std::string kCutOff =
    kUnable + "It lacks the two blocks of zeros at its end, so it was cut off";
const std::string kMoreBehind = kUnable + "It holds something else behind the end of its archive";

std::string TwoFiles() { return TarImage().File("first", "one").File("second", "two").Bytes(); }

TEST_F(UnpackTardisks, RefusesArchiveThatIsCutOffAtAnyBlock) {
  const std::string whole = TwoFiles();
  ASSERT_EQ(whole.size(), 3072U);
  for (std::size_t size = 512; size < whole.size(); size += 512) {
    EXPECT_THAT(UnpackBytes(whole.substr(0, size)), StartsWith(kUnable)) << size;
    EXPECT_FALSE(Exists("first")) << size;
  }
  EXPECT_EQ(UnpackBytes(whole.substr(0, 2048)), kCutOff);
  EXPECT_EQ(UnpackBytes(whole.substr(0, 2560)), kCutOff);
  EXPECT_EQ(UnpackBytes(whole.substr(0, 3071)), kCutOff);
  EXPECT_EQ(UnpackBytes(whole), "unpacked");
}

TEST_F(UnpackTardisks, RefusesFileThatEndsEarly) {
  TarImage image;
  image.File("file", std::string(4096, 'x'));
  EXPECT_THAT(UnpackBytes(image.Bytes().substr(0, 1024)), StartsWith(kUnable));
  EXPECT_FALSE(Exists("file"));
}

TEST_F(UnpackTardisks, TakesZerosBehindTheEnd) {
  EXPECT_EQ(UnpackBytes(TwoFiles() + std::string(10240 - 3072, '\0')), "unpacked");
  EXPECT_EQ(Content(In("second")), "two");
}

TEST_F(UnpackTardisks, RefusesAnythingElseBehindTheEnd) {
  EXPECT_EQ(UnpackBytes(TwoFiles() + "x"), kMoreBehind);
  EXPECT_EQ(UnpackBytes(TwoFiles() + std::string(100'000, '\0') + "x"), kMoreBehind);
  EXPECT_EQ(UnpackBytes(TwoFiles() + TarImage().File("third", "three").Bytes()), kMoreBehind);
  EXPECT_FALSE(Exists("first"));
}

TEST_F(UnpackTardisks, RefusesZerosBetweenTheEntries) {
  const std::string whole = TwoFiles();
  EXPECT_EQ(UnpackBytes(whole.substr(0, 1024) + std::string(512, '\0') + whole.substr(1024)),
            kMoreBehind);
  EXPECT_FALSE(Exists("first"));
}

TEST_F(UnpackTardisks, RefusesWrongCheckSumOfAnEntry) {
  std::string bytes = TwoFiles();
  bytes[1024] ^= 1;
  EXPECT_EQ(UnpackBytes(bytes), kUnable + "Damaged tar archive");
  EXPECT_FALSE(Exists("first"));
}

// Without its key, the file would come under another name.
TEST_F(UnpackTardisks, RefusesDamagedExtendedHeader) {
  std::string bytes = TarImage().Extended("path", "right").File("wrong", "text").Bytes();
  bytes[512] = 'x';
  EXPECT_THAT(UnpackBytes(bytes), StartsWith(kUnable));
  EXPECT_FALSE(Exists("wrong"));
}

// What `program` makes of `bytes`.
std::string Compressed(const std::string& program, const std::string& bytes) {
  const ScratchRoot place;
  place.Write("plain", bytes);
  const std::string path = place.Root() / "plain";
  const std::string command = program + " -c <" + path + " >" + path + ".packed";
  EXPECT_EQ(std::system(command.c_str()), 0);
  return Content(path + ".packed");
}

struct Compression {
  const char* program;
  std::size_t checkedByte;  // from the end: part of a check sum or a length
};

class UnpackCompressed : public UnpackTardisks,
                         public ::testing::WithParamInterface<Compression> {};

INSTANTIATE_TEST_SUITE_P(All, UnpackCompressed,
                         ::testing::Values(Compression{"gzip", 8}, Compression{"gzip", 4},
                                           Compression{"bzip2", 4}, Compression{"xz", 12},
                                           Compression{"zstd", 4}),
                         [](const auto& test) {
                           return test.param.program + std::to_string(test.param.checkedByte);
                         });

TEST_P(UnpackCompressed, IsUnpackedWhole) {
  EXPECT_EQ(UnpackBytes(Compressed(GetParam().program, TwoFiles())), "unpacked");
  EXPECT_EQ(Content(In("second")), "two");
}

TEST_P(UnpackCompressed, MayBeOfSeveralParts) {
  const std::string whole = TwoFiles();
  EXPECT_EQ(UnpackBytes(Compressed(GetParam().program, whole.substr(0, 1000)) +
                        Compressed(GetParam().program, whole.substr(1000))),
            "unpacked");
  EXPECT_EQ(Content(In("second")), "two");
}

TEST_P(UnpackCompressed, IsRefusedWhenACheckIsWrong) {
  std::string bytes = Compressed(GetParam().program, TwoFiles());
  bytes[bytes.size() - GetParam().checkedByte] ^= 1;
  EXPECT_THAT(UnpackBytes(bytes), StartsWith(kUnable));
  EXPECT_FALSE(Exists("first"));
}

TEST_P(UnpackCompressed, IsRefusedWhenACheckOfItsFirstPartIsWrong) {
  const std::string whole = TwoFiles();
  std::string bytes = Compressed(GetParam().program, whole.substr(0, 1000));
  bytes[bytes.size() - GetParam().checkedByte] ^= 1;
  EXPECT_THAT(UnpackBytes(bytes + Compressed(GetParam().program, whole.substr(1000))),
              StartsWith(kUnable));
  EXPECT_FALSE(Exists("first"));
}

TEST_P(UnpackCompressed, IsRefusedWhenItWasCutOff) {
  const std::string whole = Compressed(GetParam().program, TwoFiles());
  for (std::size_t size = 0; size < whole.size(); size += size + 16 < whole.size() ? 8 : 1) {
    EXPECT_THAT(UnpackBytes(whole.substr(0, size)), StartsWith(kUnable)) << size;
  }
  EXPECT_FALSE(Exists("first"));
}

TEST_P(UnpackCompressed, IsRefusedWhenSomethingFollows) {
  const std::string whole = Compressed(GetParam().program, TwoFiles());
  for (const std::string rest : {"x", "something else", "\x1f\x8b\x08"}) {
    EXPECT_THAT(UnpackBytes(whole + rest), StartsWith(kUnable)) << rest;
  }
  EXPECT_FALSE(Exists("first"));
}

TEST_P(UnpackCompressed, IsRefusedWhenItIsCompressedTwice) {
  const std::string once = Compressed(GetParam().program, TwoFiles());
  EXPECT_THAT(UnpackBytes(Compressed("bzip2", once)), StartsWith(kUnable));
  EXPECT_THAT(UnpackBytes(Compressed("gzip", once)), StartsWith(kUnable));
  EXPECT_FALSE(Exists("first"));
}

// ---- What is the policy's and the host's own

const std::string kPolicyMessage =
    ": It belongs to the policy, which a tardisk brings only when it is named by --policy-from";

TEST_F(UnpackTardisks, RefusesThePolicy) {
  for (const std::string path :
       {"etc/zorvan/secpolicy/domains/appDom", "./etc//zorvan/./secpolicy/early/domains/bootDom",
        "etc/zorvan/secpolicy/domains", "ETC/Zorvan/SecPolicy/objects/base"}) {
    TarImage image;
    image.File(path, "text");
    EXPECT_EQ(Unpack(image), kUnable + path + kPolicyMessage);
  }
  EXPECT_FALSE(Exists("etc"));
}

// A load that was killed, or who goes back by hand, makes one of these the policy.
TEST_F(UnpackTardisks, RefusesWhatLoadsKeepBesideThePolicy) {
  rules.policyTardisks = {"disk.tgz"};
  const std::string message = ": It belongs to the exchange of policies";
  for (const std::string path :
       {"etc/zorvan/secpolicy.previous/domains/appDom", "etc/zorvan/secpolicy.new",
        "./etc//zorvan/SecPolicy.Replaced/objects/base", "etc/zorvan/.secpolicy.lock"}) {
    EXPECT_EQ(Unpack(TarImage().File(path, "text")), kUnable + path + message);
    EXPECT_EQ(Unpack(TarImage().Directory(path, 0755)), kUnable + path + message);
    EXPECT_EQ(Unpack(TarImage().SymbolicLink(path, "/opt")), kUnable + path + message);
  }
  EXPECT_FALSE(Exists("etc"));
  EXPECT_EQ(Unpack(TarImage().File("etc/zorvan/sec", "text")), "unpacked");
  EXPECT_EQ(Unpack(TarImage().File("etc/zorvan/network/secpolicy.new", "text")), "unpacked");
}

TEST_F(UnpackTardisks, KnowsWhatIsBesideThePolicyByAnotherName) {
  std::filesystem::create_directories(In("opt/zorvan"));
  std::filesystem::create_directories(In("etc"));
  std::filesystem::create_symlink("../opt/zorvan", In("etc/zorvan"));
  const std::string path = "opt/zorvan/secpolicy.previous/domains/appDom";
  EXPECT_EQ(Unpack(TarImage().File(path, "text")),
            kUnable + path + ": It belongs to the exchange of policies");
}

TEST_F(UnpackTardisks, TakesThePolicyOfATardisk) {
  TarImage image;
  image.Directory("etc").Directory("etc/zorvan").Directory("etc/zorvan/secpolicy/");
  image.Directory("etc/zorvan/secpolicy/tardisks").File("etc/zorvan/secpolicy/tardisks/disk", "-E");
  EXPECT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(Content(In("etc/zorvan/secpolicy/tardisks/disk")), "-E");
}

TEST_F(UnpackTardisks, TakesThePolicyFromTheTardiskThatIsNamed) {
  TarImage image;
  image.File("etc/zorvan/secpolicy/domains/appDom", "text");
  rules.policyTardisks = {"another.tgz"};
  EXPECT_EQ(Unpack(image), kUnable + "etc/zorvan/secpolicy/domains/appDom" + kPolicyMessage);
  rules.policyTardisks = {"disk.tgz"};
  EXPECT_EQ(Unpack(image), "unpacked");
  EXPECT_EQ(Content(In("etc/zorvan/secpolicy/domains/appDom")), "text");
}

TEST_F(UnpackTardisks, RefusesSavedStatesAndSettingsOfAnyTardisk) {
  rules.policyTardisks = {"disk.tgz"};
  for (const std::string path : {"var/lib/secpolicy/config.db", "var/lib/secpolicy/saved/a.db",
                                 "var//lib/./SECPOLICY/saved/a.db", "var/lib/secpolicy"}) {
    TarImage image;
    image.File(path, "text");
    EXPECT_EQ(Unpack(image), kUnable + path + ": It belongs to the saved states and settings");
  }
  TarImage directory;
  directory.Directory("var/lib/secpolicy", 0700);
  EXPECT_EQ(Unpack(directory),
            kUnable + "var/lib/secpolicy: It belongs to the saved states and settings");
}

TEST_F(UnpackTardisks, RefusesKeysOfBundles) {
  rules.policyTardisks = {"disk.tgz"};
  const std::string path = "etc/secpolicy/bundle-keys/own.pem";
  EXPECT_EQ(Unpack(TarImage().File(path, "text")),
            kUnable + path + ": It says whose policies this host takes");
  EXPECT_EQ(Unpack(TarImage().File("etc/secpolicy/other", "text")), "unpacked");
}

TEST_F(UnpackTardisks, RefusesWhatWouldTurnTheWayToThePolicy) {
  const auto message = [](const std::string& path, const std::string& place) {
    return kUnable + path + ": It leads to " + place +
           ", so it has to be a directory that only its owner may write, and root's";
  };
  const std::string policy = "etc/zorvan/secpolicy/tardisks";
  for (const std::string path : {"etc", "etc/zorvan", "etc/zorvan/secpolicy", "Etc/zorvan"}) {
    EXPECT_EQ(Unpack(TarImage().SymbolicLink(path, "opt")), message(path, policy));
    EXPECT_EQ(Unpack(TarImage().File(path, "")), message(path, policy));
    EXPECT_EQ(Unpack(TarImage().File("opt", "").HardLink(path, "opt")), message(path, policy));
    EXPECT_EQ(Unpack(TarImage().Directory(path, 0777)), message(path, policy));
    EXPECT_EQ(Unpack(TarImage().Directory(path, 0775)), message(path, policy));
  }
  EXPECT_EQ(Unpack(TarImage().SymbolicLink("var/lib", "opt")),
            message("var/lib", "var/lib/secpolicy"));
  EXPECT_EQ(Unpack(TarImage().Directory("var").Directory("var/lib", 0755)), "unpacked");
}

TEST_F(UnpackTardisks, KeepsALinkThatLeadsToThePolicy) {
  std::filesystem::create_directories(In("real/zorvan/secpolicy"));
  std::filesystem::create_symlink("real", In("etc"));
  EXPECT_EQ(Unpack(TarImage().Directory("etc")),
            kUnable +
                "etc: It leads to etc/zorvan/secpolicy/tardisks, so it has to be a directory that "
                "only its owner may write, and root's");
  EXPECT_TRUE(std::filesystem::is_symlink(In("etc")));
}

TEST_F(UnpackTardisks, KnowsThePolicyByAnotherName) {
  std::filesystem::create_directories(In("opt/policy"));
  std::filesystem::create_directories(In("etc/zorvan"));
  std::filesystem::create_symlink("../../opt/policy", In("etc/zorvan/secpolicy"));
  EXPECT_EQ(Unpack(TarImage().File("opt/policy/domains/appDom", "text")),
            kUnable + "opt/policy/domains/appDom" + kPolicyMessage);
  EXPECT_EQ(Unpack(TarImage().File("opt/policy/tardisks/disk", "-E")), "unpacked");
  EXPECT_FALSE(Exists("opt/policy/domains"));
}

TEST_F(UnpackTardisks, RefusesLinkInPlaceOfImage) {
  TarImage image;
  image.File("file", "text");
  std::filesystem::create_symlink("../disk.tgz", In("image"));
  scratch.Write("../disk.tgz", image.Bytes());
  EXPECT_EQ(scratch.RunBeneath([this] {
    UnpackImage("image");
    return std::string("unpacked");
  }),
            "Unable to unpack tardisk image: Too many levels of symbolic links");
}

}  // namespace
}  // namespace LinuxHostTest
