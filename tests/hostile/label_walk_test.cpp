// Trees that are too deep, too wide or oddly named for a walk, and entries of every type.

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <unistd.h>

#include <climits>
#include <cstring>

#include "hostile_tree.h"
#include "support/message_of.h"

namespace HostileTest {
namespace {

using SecPolicyTest::MessageOf;

class LabelWalk : public HostileTree {
 protected:
  // Makes a chain of `levels` directories named "d" below the tree, each with its first label.
  void MakeChain(unsigned int levels) const {
    int directory = open(Tree().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    for (unsigned int level = 0; level < levels; ++level) {
      ASSERT_EQ(mkdirat(directory, "d", 0755), 0) << std::strerror(errno);
      const int next = openat(directory, "d", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
      GiveFirstLabel(next);
      close(directory);
      directory = next;
    }
    close(directory);
  }

  // The path of the chain's directory at `level`; the tree itself is level 0.
  std::string AtLevel(std::size_t level) const {
    std::string path = Tree();
    while (level-- > 0) path += "/d";
    return path;
  }
};

// Sets the limit of open descriptors while it lives.
class DescriptorLimit {
 public:
  explicit DescriptorLimit(rlim_t limit) {
    getrlimit(RLIMIT_NOFILE, &before);
    const rlimit wanted = {limit, before.rlim_max};
    isSet = setrlimit(RLIMIT_NOFILE, &wanted) == 0;
  }
  DescriptorLimit(const DescriptorLimit&) = delete;
  DescriptorLimit& operator=(const DescriptorLimit&) = delete;
  ~DescriptorLimit() { setrlimit(RLIMIT_NOFILE, &before); }

  bool IsSet() const { return isSet; }

 private:
  rlimit before{};
  bool isSet;
};

TEST_F(LabelWalk, EndsWhereThePathGetsTooLong) {
  MakeChain(5000);
  const DescriptorLimit limit(4096);
  if (!limit.IsSet()) GTEST_SKIP() << "the hard limit of open files is below 4096";
  const std::size_t deepest = (PATH_MAX - 1 - Tree().size()) / 2;
  const unsigned int descriptors = OpenDescriptors();

  EXPECT_EQ(LabelTree(), "Unable to set file label (toolLabel) for file " + AtLevel(deepest + 1) +
                             ": File name too long");

  EXPECT_EQ(LabelOf(AtLevel(deepest)), kLabel);
  EXPECT_EQ(OpenDescriptors(), descriptors);
}

TEST_F(LabelWalk, EndsWhereDescriptorsRunOut) {
  constexpr unsigned int kLimit = 256;
  MakeChain(5000);
  ASSERT_EQ(MessageOf([&] { SecPolicy::SetFileLabel(Tree(), kLabel, Access()); }), "");
  const unsigned int descriptors = OpenDescriptors();
  const unsigned int deepest = kLimit - descriptors;  // one is open at each level
  const DescriptorLimit limit(kLimit);
  ASSERT_TRUE(limit.IsSet());

  EXPECT_EQ(LabelTree(), "Unable to open directory " + AtLevel(deepest));

  EXPECT_EQ(OpenDescriptors(), descriptors);
  EXPECT_EQ(LabelOf(AtLevel(deepest)), kLabel);
  EXPECT_EQ(LabelOf(AtLevel(deepest + 1)), kFirstLabel);
}

TEST_F(LabelWalk, LabelsAHundredThousandEntries) {
  constexpr unsigned int kEntries = 100'000;
  for (unsigned int i = 0; i < kEntries; ++i) MakeFile(*this / std::to_string(i));

  EXPECT_EQ(LabelTree(), "");

  unsigned int labelled = 0;
  for (unsigned int i = 0; i < kEntries; ++i) {
    if (LabelOf(*this / std::to_string(i)) == kLabel) ++labelled;
  }
  EXPECT_EQ(labelled, kEntries);
}

TEST_F(LabelWalk, TakesNamesAsBytes) {
  const std::string names[] = {
      "line\nfeed", "\xff\xfe not UTF-8",
      "tab\t",      "trailing ",
      "#comment",   "*",
      "%s%n",       "\x01\x7f",
      "...",        std::string(NAME_MAX, 'n'),
  };
  for (const std::string& name : names) {
    MakeDirectory(*this / name);
    MakeFile(*this / name + "/" + name);
  }

  EXPECT_EQ(LabelTree(), "");

  for (const std::string& name : names) {
    EXPECT_EQ(LabelOf(*this / name), kLabel) << name;
    EXPECT_EQ(LabelOf(*this / name + "/" + name), kLabel) << name;
  }
}

TEST_F(LabelWalk, QuotesNamesAsTheyAre) {
  const std::string name = "\xff\nError: forged";
  const std::string path = Unlabelled() + "/" + name;
  ASSERT_EQ(mkdir(path.c_str(), 0755), 0);

  EXPECT_EQ(MessageOf([&] { SecPolicy::SetFileLabel(path, kLabel, Access()); }),
            "Unable to set file label (toolLabel) for file " + path + ": No data available");
}

TEST_F(LabelWalk, LabelsEveryTypeButLinksAndSockets) {
  MakeFile(*this / "regular");
  MakeDirectory(*this / "directory");
  MakeFile(Outside() + "/target");
  ASSERT_EQ(symlink((Outside() + "/target").c_str(), (*this / "link to file").c_str()), 0);
  ASSERT_EQ(symlink(Outside().c_str(), (*this / "link to directory").c_str()), 0);
  ASSERT_EQ(symlink("nowhere", (*this / "dangling link").c_str()), 0);
  ASSERT_EQ(symlink("loop", (*this / "loop").c_str()), 0);

  EXPECT_EQ(LabelTree(), "");

  EXPECT_EQ(LabelOf(*this / "regular"), kLabel);
  EXPECT_EQ(LabelOf(*this / "directory"), kLabel);
  EXPECT_EQ(LabelOf(*this / "dangling link"), "");
  EXPECT_EQ(LabelOf(Outside()), kFirstLabel);
  EXPECT_EQ(LabelOf(Outside() + "/target"), kFirstLabel);
}

TEST_F(LabelWalk, LabelsPipesAndDevicesAndNoSockets) {
  if (geteuid() != 0) GTEST_SKIP() << "only the superuser makes devices and labels them";
  const std::string pipe = *this / "pipe";
  const std::string character = *this / "character";
  const std::string block = *this / "block";
  const std::string socketPath = *this / "socket";
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  if (mknod(character.c_str(), S_IFCHR | 0600, makedev(1, 3)) != 0 ||
      mknod(block.c_str(), S_IFBLK | 0600, makedev(7, 0)) != 0) {
    GTEST_SKIP() << "no devices can be made here: " << std::strerror(errno);
  }
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, socketPath.c_str(), sizeof address.sun_path - 1);
  const int listener = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  ASSERT_EQ(bind(listener, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  close(listener);
  for (const std::string& path : {pipe, character, block, socketPath}) GiveFirstLabel(path);

  EXPECT_EQ(LabelTree(), "");

  EXPECT_EQ(LabelOf(pipe), kLabel);
  EXPECT_EQ(LabelOf(character), kLabel);
  EXPECT_EQ(LabelOf(block), kLabel);
  EXPECT_EQ(LabelOf(socketPath), kFirstLabel);
}

TEST_F(LabelWalk, TakesAPathOfTheGreatestLength) {
  MakeFile(*this / "f");
  std::string path = Tree();
  while (path.size() + 2 + 2 <= PATH_MAX - 1) path += "/.";
  path += path.size() + 2 == PATH_MAX - 1 ? "/f" : "//f";
  ASSERT_EQ(path.size(), PATH_MAX - 1U);

  EXPECT_EQ(MessageOf([&] { SecPolicy::SetFileLabel(path, kLabel, Access()); }), "");

  EXPECT_EQ(LabelOf(*this / "f"), kLabel);
}

TEST_F(LabelWalk, RefusesAPathBeyondTheGreatestLength) {
  MakeFile(*this / "f");
  std::string path = Tree();
  while (path.size() + 2 < PATH_MAX) path += "/.";
  path += "/f";

  EXPECT_EQ(MessageOf([&] { SecPolicy::SetFileLabel(path, kLabel, Access()); }),
            "Unable to set file label (toolLabel) for file " + path + ": File name too long");
  EXPECT_EQ(MessageOf([&] { SecPolicy::GetFileLabel(path, Access()); }),
            "Unable to get file label for file " + path + ":File name too long");

  EXPECT_EQ(LabelOf(*this / "f"), kFirstLabel);
}

}  // namespace
}  // namespace HostileTest
