// Paths as the host resolves them: links, dots, loops, and the last byte of the caller's buffer.

#include <gtest/gtest.h>

#include <climits>

#include "host/linux/files/directory_entry.h"
#include "host/linux/files/real_path.h"
#include "kitlibs/file.h"
#include "scratch_root.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

constexpr std::size_t kResolvedSize = 1984;

// The real path as the kernel call gives it; "(none)" when it fails.
std::string RealPath(const std::string& path) {
  char resolved[kResolvedSize];
  return Zorvan::Kernel::RealPath(path.c_str(), resolved) == 0 ? resolved : "(none)";
}

class Files : public ::testing::Test {
 protected:
  std::string Directory() const { return std::filesystem::canonical(scratch.Directory()).string(); }

  // Makes a directory whose real path has `length` bytes.
  std::filesystem::path MakeDirectory(std::size_t length) const {
    std::filesystem::path path = Directory();
    while (length - path.string().size() > 220) path /= std::string(200, 'd');
    path /= std::string(length - path.string().size() - 1, 'e');
    std::filesystem::create_directories(path);
    return path;
  }

  ScratchRoot scratch;
};

TEST(JoinPath, PutsOneSlashBetweenADirectoryAndAName) {
  EXPECT_EQ(LinuxHost::JoinPath("/", "name"), "/name");
  EXPECT_EQ(LinuxHost::JoinPath("/some", "name"), "/some/name");
  EXPECT_EQ(LinuxHost::JoinPath("/some/", "name"), "/some/name");
  EXPECT_EQ(LinuxHost::JoinPath(".", "name"), "name");
  EXPECT_EQ(LinuxHost::JoinPath("/some", "."), "/some");
}

TEST_F(Files, RealPathFollowsLinksAndDots) {
  scratch.Write("usr/bin/program", "code");
  std::filesystem::create_symlink("usr/bin", scratch.Root() / "bin");
  const std::string real = Directory() + "/root/usr/bin/program";
  EXPECT_EQ(RealPath(Directory() + "/root/bin//./program"), real);
  for (const std::string dots : {"/root/./usr/bin/program", "/root/../root/usr/bin/program"}) {
    EXPECT_EQ(RealPath(Directory() + dots), real);
  }
  EXPECT_EQ(RealPath(real), real);
}

TEST_F(Files, RealPathFailsForWhatCannotBeResolved) {
  std::filesystem::create_symlink("loop", scratch.Root() / "loop");
  EXPECT_EQ(RealPath(Directory() + "/missing"), "(none)");
  EXPECT_EQ(RealPath(Directory() + "/root/loop"), "(none)");
  EXPECT_EQ(RealPath(""), "(none)");
}

TEST_F(Files, RealPathLooksOnceForWhatIsNoLinkWhileALoadLasts) {
  scratch.Write("file", "text");
  const std::string real = Directory() + "/root/file";
  {
    const LinuxHost::OneLook look;
    EXPECT_EQ(RealPath(real), real);
    std::filesystem::remove(real);
    EXPECT_EQ(RealPath(real), real);
  }
  EXPECT_EQ(RealPath(real), "(none)");
}

TEST_F(Files, RealPathFollowsEachLinkAnewWhileALoadLasts) {
  scratch.Write("first", "text");
  scratch.Write("second", "text");
  const std::filesystem::path link = scratch.Root() / "link";
  const LinuxHost::OneLook look;
  for (const std::string target : {"missing", "first", "second"}) {
    std::filesystem::remove(link);
    std::filesystem::create_symlink(target, link);
    const std::string real = Directory() + "/root/" + target;
    EXPECT_EQ(RealPath(Directory() + "/root/link"), target == "missing" ? "(none)" : real);
  }
}

TEST_F(Files, RealPathFillsTheBufferAndNoMore) {
  const std::string fitting = MakeDirectory(kResolvedSize - 1);
  ASSERT_EQ(fitting.size(), kResolvedSize - 1);
  EXPECT_EQ(RealPath(fitting), fitting);
  EXPECT_EQ(RealPath(MakeDirectory(kResolvedSize)), "(none)");
}

TEST_F(Files, ExistenceFollowsLinks) {
  scratch.Write("file", "text");
  std::filesystem::create_symlink("file", scratch.Root() / "link");
  std::filesystem::create_symlink("missing", scratch.Root() / "dangling");
  EXPECT_TRUE(File_Exists((scratch.Root() / "file").c_str()));
  EXPECT_TRUE(File_Exists((scratch.Root() / "link").c_str()));
  EXPECT_TRUE(File_Exists(scratch.Root().c_str()));
  EXPECT_FALSE(File_Exists((scratch.Root() / "dangling").c_str()));
  EXPECT_FALSE(File_Exists((scratch.Root() / "missing").c_str()));
}

TEST_F(Files, DirectoryFollowsLinks) {
  scratch.Write("file", "text");
  std::filesystem::create_directory_symlink(scratch.Root(), scratch.Directory() / "link");
  EXPECT_TRUE(File_IsDirectory(scratch.Root().c_str()));
  EXPECT_TRUE(File_IsDirectory((scratch.Directory() / "link").c_str()));
  EXPECT_FALSE(File_IsDirectory((scratch.Root() / "file").c_str()));
  EXPECT_FALSE(File_IsDirectory((scratch.Root() / "missing").c_str()));
}

}  // namespace
}  // namespace LinuxHostTest
