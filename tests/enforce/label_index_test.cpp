// The label index: what it answers agrees with a model of a tree that knows every file, what is
// written is read back, and a file that is anything else is refused.

#include "host/enforce/label_index.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <random>
#include <set>

#include "host/enforce/checksum.h"
#include "support/message_of.h"
#include "support/temporary_directory.h"

namespace EnforceTest {
namespace {

using Enforce::ComesBefore;
using Enforce::IndexedRoot;
using Enforce::kNotIndexed;
using Enforce::LabelIndex;
using Enforce::LabelledPlace;
using SecPolicyTest::MessageOf;
using ::testing::ElementsAre;

constexpr IndexedRoot kRoot = {.device = 42, .serial = 7};

std::vector<LabelledPlace> PlacesOf(std::span<const LabelledPlace> places) {
  return {places.begin(), places.end()};
}

std::vector<LabelledPlace> AllPlacesOf(const LabelIndex& index) {
  return {index.begin(), index.end()};
}

TEST(OrderOfPlaces, PutsADirectoryRightBeforeWhatIsBelowIt) {
  std::vector<std::string> paths = {"/b",
                                    "/a.b",
                                    "/a/b",
                                    "/",
                                    "/a",
                                    "/a\n",
                                    "/a/b/c",
                                    "/\xff",
                                    "/a/"
                                    "\x01",
                                    "/ab"};
  std::sort(paths.begin(), paths.end(), ComesBefore);
  EXPECT_THAT(paths, ElementsAre("/", "/a", "/a/\x01", "/a/b", "/a/b/c", "/a\n", "/a.b", "/ab",
                                 "/b", "/\xff"));
}

// A tree as a host sees it: every file, and what it carries.
class Model {
 public:
  explicit Model(unsigned int seed) : random(seed) {
    Add("/", true);
    for (unsigned int count = Below(60); count > 0; --count) Grow();
  }

  std::uint32_t LabelOf(const std::string& path) const {
    const auto found = files.find(path);
    if (found != files.end() && found->second.carried != 0) return found->second.carried;
    return path == "/" ? Enforce::kUnlabelled : LabelOf(Above(path));
  }

  // As an index is to have them: what differs from the directory above.
  std::vector<LabelledPlace> Places() const {
    std::vector<LabelledPlace> places;
    for (const auto& [path, file] : files) {
      if (path != "/" && LabelOf(path) == LabelOf(Above(path))) continue;
      places.push_back({path, LabelOf(path), file.isDirectory});
    }
    std::sort(places.begin(), places.end(), [](const auto& one, const auto& other) {
      return Components(one.path) < Components(other.path);
    });
    return places;
  }

  std::vector<LabelledPlace> PlacesBelow(const std::string& directory) const {
    std::vector<LabelledPlace> places = Places();
    const std::string prefix = directory == "/" ? "/" : directory + "/";
    std::erase_if(places, [&](const LabelledPlace& place) {
      return place.path == "/" || !place.path.starts_with(prefix);
    });
    return places;
  }

  std::vector<std::string> Paths() const {
    std::vector<std::string> paths;
    for (const auto& [path, file] : files) paths.push_back(path);
    return paths;
  }

 private:
  struct ModelFile {
    bool isDirectory;
    std::uint32_t carried;  // 0: it inherits
  };

  static std::string Above(const std::string& path) {
    return std::filesystem::path(path).parent_path();
  }

  static std::vector<std::string> Components(const std::string& path) {
    std::vector<std::string> names;
    for (const auto& name : std::filesystem::path(path)) names.push_back(name);
    return names;
  }

  unsigned int Below(unsigned int limit) {
    return std::uniform_int_distribution<unsigned int>(0, limit - 1)(random);
  }

  void Add(const std::string& path, bool isDirectory) {
    files.try_emplace(path, ModelFile{isDirectory, Below(3) == 0 ? 2 + Below(3) : 0});
    if (isDirectory) directories.push_back(path);
  }

  void Grow() {
    static const std::vector<std::string> kNames = {"a",    "b",        "a.b", "a b", "ab",   "\n",
                                                    "a\nb", "\xc3\xa4", "-",   "~",   "\x01", ".x"};
    const std::string& above = directories[Below(static_cast<unsigned int>(directories.size()))];
    const std::string path =
        (above == "/" ? "" : above) + "/" + kNames[Below(static_cast<unsigned int>(kNames.size()))];
    if (!files.contains(path)) Add(path, Below(2) == 0);
  }

  std::mt19937 random;
  std::map<std::string, ModelFile> files;
  std::vector<std::string> directories;
};

unsigned int Rounds() { return std::getenv("SECPOLICY_LONG_TESTS") != nullptr ? 20'000 : 500; }

TEST(LabelIndexOfATree, AgreesWithOneThatKnowsEveryFile) {
  for (unsigned int seed = 0; seed < Rounds(); ++seed) {
    const Model model(seed);
    const LabelIndex index(kRoot, model.Places());
    for (const std::string& path : model.Paths()) {
      ASSERT_EQ(index.LabelOf(path), model.LabelOf(path)) << seed << ": " << path;
      const std::string made = path + (path == "/" ? "new" : "/new");
      ASSERT_EQ(index.LabelOf(made), model.LabelOf(path)) << seed << ": " << made;
      ASSERT_EQ(PlacesOf(index.PlacesBelow(path)), model.PlacesBelow(path)) << seed << ": " << path;
    }
    ASSERT_EQ(AllPlacesOf(index), model.Places()) << seed;
  }
}

TEST(LabelIndexOfATree, KnowsNothingAboveItsPlaces) {
  const LabelIndex index(kRoot, {{"/a", 5, true}});
  EXPECT_EQ(index.LabelOf("/a/b"), 5U);
  EXPECT_EQ(index.LabelOf("/ab"), kNotIndexed);
  EXPECT_EQ(index.LabelOf("/"), kNotIndexed);
  EXPECT_EQ(index.LabelOf("a"), kNotIndexed);
  EXPECT_EQ(index.LabelOf(""), kNotIndexed);
  EXPECT_EQ(LabelIndex(kRoot, {}).LabelOf("/a"), kNotIndexed);
}

TEST(LabelIndexOfATree, IsOfPlacesInOrder) {
  const auto refusal = [](std::vector<LabelledPlace> places) {
    return MessageOf([&] { const LabelIndex index(kRoot, std::move(places)); });
  };
  EXPECT_EQ(refusal({{"/a", 5, true}, {"/a/b", 6, false}, {"/a.b", 5, false}}), "");
  EXPECT_EQ(refusal({{"/a", 5, true}, {"/a.b", 5, false}, {"/a/b", 6, false}}),
            "The places of a label index are not in ascending order: /a/b");
  EXPECT_EQ(refusal({{"/a", 5, true}, {"/a", 6, true}}),
            "The places of a label index are not in ascending order: /a");
  EXPECT_EQ(refusal({{"a", 5, true}}), "The places of a label index are not in ascending order: a");
}

class LabelIndexFile : public ::testing::Test {
 protected:
  std::string Content() const {
    std::ifstream input(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(input), {}};
  }

  void SetContent(const std::string& content) const {
    std::ofstream(file, std::ios::binary | std::ios::trunc) << content;
  }

  std::string Refusal() const {
    return MessageOf([&] { LabelIndex::Read(file); });
  }

  std::string Damaged(const std::string& reason) const {
    return "The label index " + file + " is damaged (" + reason +
           "). Run \"secpolicy load\", which makes a new one";
  }

  std::size_t CountFiles() const {
    return static_cast<std::size_t>(
        std::distance(std::filesystem::directory_iterator(directory.Path()), {}));
  }

  const SecPolicyTest::TemporaryDirectory directory;
  const std::string file = directory / "labels.index";
  const LabelIndex index{kRoot,
                         {{"/", 2, true},
                          {"/a", 1, true},
                          {"/a/new\nline", 0xffffffff, false},
                          {"/a/" + std::string(70'000, 'x'), 300, true},
                          {"/b", kNotIndexed, true}}};
};

TEST_F(LabelIndexFile, IsReadAsItWasWritten) {
  index.Write(file);
  const LabelIndex read = LabelIndex::Read(file);
  EXPECT_EQ(read.Root(), kRoot);
  EXPECT_EQ(AllPlacesOf(read), AllPlacesOf(index));
  struct stat status {};
  ASSERT_EQ(stat(file.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600U);
  EXPECT_EQ(CountFiles(), 1U);
}

TEST_F(LabelIndexFile, OfRandomTreesIsReadAsItWasWritten) {
  for (unsigned int seed = 0; seed < Rounds() / 10; ++seed) {
    const LabelIndex written({.device = seed, .serial = seed * 3}, Model(seed).Places());
    written.Write(file);
    const LabelIndex read = LabelIndex::Read(file);
    ASSERT_EQ(read.Root(), written.Root()) << seed;
    ASSERT_EQ(AllPlacesOf(read), AllPlacesOf(written)) << seed;
  }
}

TEST_F(LabelIndexFile, TakesThePlaceOfTheOneBeforeAsAWhole) {
  LabelIndex(kRoot, {{"/", 9, true}}).Write(file);
  const std::string link = directory / "before";
  ASSERT_EQ(::link(file.c_str(), link.c_str()), 0);
  index.Write(file);
  EXPECT_EQ(LabelIndex::Read(file).LabelOf("/"), 2U);
  EXPECT_EQ(LabelIndex::Read(link).LabelOf("/"), 9U);
}

TEST_F(LabelIndexFile, IsWrittenOverALinkAndNotThroughIt) {
  const std::string target = directory / "target";
  ASSERT_EQ(symlink(target.c_str(), file.c_str()), 0);
  index.Write(file);
  EXPECT_FALSE(std::filesystem::exists(target));
  EXPECT_EQ(LabelIndex::Read(file).LabelOf("/"), 2U);
}

TEST_F(LabelIndexFile, ThatCannotBeWrittenLeavesNothing) {
  const std::string missing = directory / "missing/labels.index";
  EXPECT_EQ(MessageOf([&] { index.Write(missing); }),
            "Unable to write the label index " + missing + ": No such file or directory");
  // A directory that is in the way is noticed when all is written.
  std::filesystem::create_directory(file);
  EXPECT_EQ(MessageOf([&] { index.Write(file); }),
            "Unable to write the label index " + file + ": Is a directory");
  EXPECT_EQ(CountFiles(), 1U);
}

TEST_F(LabelIndexFile, IsRefusedWithAnyOtherBit) {
  LabelIndex(kRoot, {{"/", 2, true}, {"/a", 3, false}}).Write(file);
  const std::string good = Content();
  EXPECT_EQ(Refusal(), "");
  for (std::size_t bit = 0; bit < good.size() * 8; ++bit) {
    std::string bad = good;
    bad[bit / 8] = static_cast<char>(bad[bit / 8] ^ (1 << bit % 8));
    SetContent(bad);
    EXPECT_NE(Refusal(), "") << bit;
  }
}

TEST_F(LabelIndexFile, IsRefusedWhenItIsCutOffOrGoesOn) {
  index.Write(file);
  const std::string good = Content();
  SetContent("");
  EXPECT_EQ(Refusal(), Damaged("it is cut off"));
  for (std::size_t size = 1; size < good.size(); size += size < 200 ? 1 : 997) {
    SetContent(good.substr(0, size));
    EXPECT_NE(Refusal(), "") << size;
  }
  SetContent(good + 'x');
  EXPECT_EQ(Refusal(), Damaged("its checksum is wrong"));
}

TEST_F(LabelIndexFile, IsRefusedWhenItIsSomethingElse) {
  SetContent("SQLite format 3, or whatever else there may be in a file");
  EXPECT_EQ(Refusal(), Damaged("it is something else"));
  index.Write(file);
  std::string other = Content();
  other[8] = 2;
  SetContent(other);
  EXPECT_EQ(Refusal(), "The label index " + file +
                           " has version 2, this program works with version 1. Run \"secpolicy "
                           "load\", which makes a new one");
}

TEST_F(LabelIndexFile, BeginsAsThoseOfEarlierVersionsDo) {
  index.Write(file);
  EXPECT_TRUE(Content().starts_with("ZorvLab\n"));
}

// With the checksum of what it is, it would be taken for another index.
TEST_F(LabelIndexFile, IsRefusedWhenAPlaceSharesMoreThanThereIs) {
  constexpr std::size_t kFirstPlace = 40;
  LabelIndex(kRoot, {{"/", 2, true}}).Write(file);
  const auto change = [&](std::size_t byte) {
    std::string content = Content();
    ++content[byte];
    content.resize(content.size() - sizeof(std::uint64_t));
    const std::uint64_t sum = Enforce::Checksum(content);
    SetContent(content.append(reinterpret_cast<const char*>(&sum), sizeof sum));
  };
  change(kFirstPlace + 2);
  EXPECT_EQ(LabelIndex::Read(file).LabelOf("/"), 3U);
  change(kFirstPlace);
  EXPECT_EQ(Refusal(), Damaged("a place is wrong"));
}

// The kernel tells more bytes of its own files than there are to be read.
TEST_F(LabelIndexFile, IsRefusedWhenItBecomesShorterWhileItIsRead) {
  const std::string shorter = "/sys/kernel/uevent_seqnum";
  if (!std::filesystem::is_regular_file(shorter)) GTEST_SKIP() << "there is no such file here";
  EXPECT_EQ(MessageOf([&] { LabelIndex::Read(shorter); }),
            "The label index " + shorter +
                " is damaged (it is cut off). Run \"secpolicy load\", which makes a new one");
}

TEST_F(LabelIndexFile, IsRefusedWhenItIsNoRegularFile) {
  EXPECT_EQ(Refusal(), "Unable to open the label index " + file + ": No such file or directory");
  ASSERT_EQ(mkfifo(file.c_str(), 0600), 0);
  EXPECT_EQ(Refusal(), Damaged("it is no regular file"));
  std::filesystem::remove(file);
  ASSERT_EQ(symlink("/dev/null", file.c_str()), 0);
  EXPECT_EQ(Refusal(),
            "Unable to open the label index " + file + ": Too many levels of symbolic links");
}

}  // namespace
}  // namespace EnforceTest
