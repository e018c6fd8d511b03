// An ordinary user's labelling and reading: it works on what is the user's own and ends where the
// system refuses.

#include <sys/stat.h>
#include <sys/wait.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>

#include "hostile_tree.h"
#include "run_child.h"
#include "support/temporary_directory.h"

namespace HostileTest {
namespace {

constexpr unsigned int kUser = 65534;
constexpr char kAttribute[] = "user.zorvan.security";  // where an ordinary user's labels lie

class Unprivileged : public testing::Test {
 protected:
  void SetUp() override {
    if (geteuid() != 0) GTEST_SKIP() << "only the superuser can become another user";
    ASSERT_EQ(chown(scratch.Path().c_str(), kUser, kUser), 0);
    Make("tree", 0755);
  }

  std::string operator/(const std::string& name) const { return scratch / name; }

  // Makes a directory of the user with its first label.
  void Make(const std::string& name, mode_t mode) const {
    const std::string path = *this / name;
    ASSERT_EQ(mkdir(path.c_str(), 0755), 0);
    constexpr std::uint32_t kFirst = 2;
    ASSERT_EQ(setxattr(path.c_str(), kAttribute, &kFirst, sizeof kFirst, 0), 0);
    ASSERT_EQ(chown(path.c_str(), kUser, kUser), 0);
    ASSERT_EQ(chmod(path.c_str(), mode), 0);
  }

  bool IsLabelled(const std::string& name) const {
    std::uint32_t id = 0;
    return getxattr((*this / name).c_str(), kAttribute, &id, sizeof id) == sizeof id && id > 3;
  }

  std::string LabelTree() const {
    return RunChild({"label", std::to_string(kUser), *this / "state", *this / "tree"}).output;
  }

  std::string ReadPolicyFiles() const {
    return RunChild({"read", std::to_string(kUser), *this / "tree"}).output;
  }

 private:
  SecPolicyTest::TemporaryDirectory scratch;
};

TEST_F(Unprivileged, LabelsItsOwnTree) {
  Make("tree/inner", 0755);

  EXPECT_EQ(LabelTree(), "");

  EXPECT_TRUE(IsLabelled("tree"));
  EXPECT_TRUE(IsLabelled("tree/inner"));
}

TEST_F(Unprivileged, EndsAtADirectoryThatCannotBeListed) {
  Make("tree/unreadable", 0300);

  EXPECT_EQ(LabelTree(), "Unable to open directory " + *this / "tree/unreadable" + "\n");

  EXPECT_TRUE(IsLabelled("tree/unreadable"));
}

TEST_F(Unprivileged, EndsAtADirectoryThatCannotBeWritten) {
  Make("tree/unwritable", 0500);

  EXPECT_EQ(LabelTree(), "Unable to set file label (toolLabel) for file " +
                             *this / "tree/unwritable" + ": Permission denied\n");

  EXPECT_FALSE(IsLabelled("tree/unwritable"));
}

TEST_F(Unprivileged, LabelsADirectoryThatCannotBeEntered) {
  Make("tree/closed", 0600);
  Make("tree/closed/inner", 0755);

  EXPECT_EQ(LabelTree(), "Unable to set file label (toolLabel) for file " +
                             *this / "tree/closed/inner" + ": Permission denied\n");

  EXPECT_TRUE(IsLabelled("tree/closed"));
  EXPECT_FALSE(IsLabelled("tree/closed/inner"));
}

TEST_F(Unprivileged, EndsAtAFileOfAnotherUser) {
  Make("tree/foreign", 0755);
  ASSERT_EQ(chown((*this / "tree/foreign").c_str(), 0, 0), 0);

  EXPECT_EQ(LabelTree(), "Unable to set file label (toolLabel) for file " + *this / "tree/foreign" +
                             ": Permission denied\n");

  EXPECT_FALSE(IsLabelled("tree/foreign"));
}

TEST_F(Unprivileged, IsRefusedAPolicyDirectoryThatCannotBeRead) {
  ASSERT_EQ(chmod((*this / "tree").c_str(), 0300), 0);

  EXPECT_EQ(ReadPolicyFiles(), "Unable to open policy directory " + *this / "tree" + "\n");
}

TEST_F(Unprivileged, IsRefusedAPolicyFileThatCannotBeRead) {
  std::ofstream(*this / "tree/objects") << "toolLabel\n";
  ASSERT_EQ(chmod((*this / "tree/objects").c_str(), 0), 0);

  EXPECT_EQ(ReadPolicyFiles(), "Unable to open policy file " + *this / "tree/objects" + "\n");
}

TEST_F(Unprivileged, ReadsAPolicyFileOfAnotherUser) {
  std::ofstream(*this / "tree/objects") << "toolLabel\n";

  EXPECT_EQ(ReadPolicyFiles(), "");
}

}  // namespace
}  // namespace HostileTest
