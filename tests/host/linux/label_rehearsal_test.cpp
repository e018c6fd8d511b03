#include "host/linux/label_rehearsal.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "scratch_root.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::StartLabelRehearsal;

constexpr char kName[] = "zorvan.security";

std::string Told(ssize_t result) {
  return result < 0 ? strerrorname_np(errno) : std::to_string(result);
}

std::string Give(const char* path, std::uint32_t id, int flags = XATTR_REPLACE) {
  return Told(Zorvan::Kernel::SetXattr(path, kName, &id, sizeof id, flags));
}

std::string Label(const char* path) {
  std::uint32_t id = 0;
  const ssize_t size = Zorvan::Kernel::GetXattr(path, kName, &id, sizeof id);
  return size == sizeof id ? std::to_string(id) : Told(size);
}

// The real attribute, whatever is noted.
std::string RealLabel(const char* path) {
  std::uint32_t id = 0;
  for (const char* name : {"security.zorvan", "user.zorvan.security"}) {
    if (getxattr(path, name, &id, sizeof id) == sizeof id) return std::to_string(id);
  }
  return "none";
}

std::string Changes() {
  std::string text;
  for (const auto& change : LinuxHost::RehearsedLabels()) {
    text += change.path + ":" + std::to_string(change.before) + (change.IsLasting() ? ">" : "=") +
            std::to_string(change.after) + " ";
  }
  return text;
}

// Makes the file immutable, or lets it be changed again.
bool SetImmutable(const std::string& path, bool immutable) {
  const int file = open(path.c_str(), O_RDONLY);
  unsigned int flags = 0;
  bool done = ioctl(file, FS_IOC_GETFLAGS, &flags) == 0;
  flags = immutable ? flags | FS_IMMUTABLE_FL : flags & ~static_cast<unsigned int>(FS_IMMUTABLE_FL);
  done = done && ioctl(file, FS_IOC_SETFLAGS, &flags) == 0;
  close(file);
  return done;
}

// The file "labelled" carries 7; "bare" carries nothing.
class LabelRehearsal : public ::testing::Test {
 protected:
  void SetUp() override {
    scratch.Write("labelled", "text");
    scratch.Write("bare", "text");
    ASSERT_EQ(Run([] { return Give("labelled", 7, 0); }), "0");
  }

  std::string Run(const std::function<std::string()>& body) { return scratch.RunBeneath(body); }

  ScratchRoot scratch;
};

TEST_F(LabelRehearsal, ReadsBackWhatItGaveAndLeavesTheFile) {
  EXPECT_EQ(Run([] {
              StartLabelRehearsal();
              const std::string before = Label("labelled");
              std::string given = Give("labelled", 8);
              given += Give("labelled", 9);
              return before + " " + given + " " + Label("labelled") + " " + RealLabel("labelled");
            }),
            "7 00 9 7");
  EXPECT_EQ(Run([] { return Label("labelled"); }), "7");
}

TEST_F(LabelRehearsal, FailsWhereGivingWould) {
  EXPECT_EQ(Run([] {
              StartLabelRehearsal();
              return Give("bare", 8) + " " + Give("missing", 8) + " " + Give("labelled/x", 8) +
                     " " + Give("labelled", 8, XATTR_CREATE) + " " + Label("bare") + Changes();
            }),
            "ENODATA ENOENT ENOTDIR EEXIST ENODATA");
}

TEST_F(LabelRehearsal, TakesOnlyIdentifiers) {
  EXPECT_EQ(Run([] {
              StartLabelRehearsal();
              return Told(Zorvan::Kernel::SetXattr("labelled", kName, "odd", 3, XATTR_REPLACE)) +
                     Changes();
            }),
            "EINVAL");
}

TEST_F(LabelRehearsal, NeedsBufferThatIsLargeEnough) {
  EXPECT_EQ(Run([] {
              StartLabelRehearsal();
              Give("labelled", 8);
              char buffer[3];
              return Told(Zorvan::Kernel::GetXattr("labelled", kName, nullptr, 0)) + " " +
                     Told(Zorvan::Kernel::GetXattr("labelled", kName, buffer, sizeof buffer));
            }),
            "4 ERANGE");
}

TEST_F(LabelRehearsal, TellsChangesInTheOrderOfPaths) {
  scratch.Write("another", "text");
  EXPECT_EQ(Run([] {
              Give("another", 3, 0);
              StartLabelRehearsal();
              Give("labelled", 8);
              Give("another", 4);
              Give("another", 5);
              return Changes();
            }),
            "another:3>5 labelled:7>8 ");
}

TEST_F(LabelRehearsal, TellsAlsoAFileWhoseLabelIsTheSameInTheEnd) {
  EXPECT_EQ(Run([] {
              StartLabelRehearsal();
              Give("labelled", 8);
              Give("labelled", 7);
              return Changes();
            }),
            "labelled:7=7 ");
}

TEST_F(LabelRehearsal, KnowsAFileByAllItsNames) {
  std::filesystem::create_hard_link(scratch.Root() / "labelled", scratch.Root() / "alias");
  std::filesystem::create_symlink("labelled", scratch.Root() / "link");
  EXPECT_EQ(Run([] {
              StartLabelRehearsal();
              Give("link", 8);
              Give("alias", 9);
              return Label("labelled") + " " + Changes();
            }),
            "9 link:7>9 ");
}

TEST_F(LabelRehearsal, TellsAFirstLabelAndOneThatIsNoIdentifier) {
  EXPECT_EQ(Run([] {
              Zorvan::Kernel::SetXattr("labelled", kName, "odd", 3, 0);
              StartLabelRehearsal();
              Give("bare", 8, 0);
              Give("labelled", 8);
              return Changes() + RealLabel("bare");
            }),
            "bare:0>8 labelled:0>8 none");
}

TEST_F(LabelRehearsal, PassesOverADirectory) {
  std::filesystem::create_directory(scratch.Root() / "own");
  scratch.Write("own/file", "text");
  std::filesystem::create_symlink("own", scratch.Root() / "link");
  EXPECT_EQ(
      Run([] {
        StartLabelRehearsal("own");
        std::string given;
        for (const char* path : {"own", "own/file", "link//file", "own/gone", "bare", "labelled"}) {
          given += Give(path, 8) + " ";
        }
        return given + Changes() + RealLabel("own/file");
      }),
      "0 0 0 0 ENODATA 0 labelled:7>8 none");
}

TEST_F(LabelRehearsal, FailsOnAFileThatCannotBeChanged) {
  const std::string path = scratch.Root() / "labelled";
  if (!SetImmutable(path, true)) GTEST_SKIP() << "this file system makes no file immutable";
  const std::string really = Run([] { return Give("labelled", 8); });
  const std::string rehearsed = Run([] {
    StartLabelRehearsal();
    return Give("labelled", 8) + Changes();
  });
  SetImmutable(path, false);
  EXPECT_EQ(really, "EPERM");
  EXPECT_EQ(rehearsed, "EPERM");
}

}  // namespace
}  // namespace LinuxHostTest
