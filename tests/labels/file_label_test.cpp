// Labels of files and trees: which entries get one, in which order, how often, what ends a walk,
// and that every directory is closed.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <pthread.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <functional>
#include <string>

#include "labels/file_system_faults.h"
#include "secpolicy/secpolicy.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using testing::UnorderedElementsAre;

constexpr std::uint32_t kToolId = 0x01020304;

// The host calls that give `path` the label "toolLabel".
std::string Labelled(const std::string& path) {
  return "LookupLabel(\"toolLabel\", OBJECT)\nSetXattr(" + Quoted(path) +
         ", \"zorvan.security\", 16909060, 4, 2)";
}

class FileLabelTest : public testing::Test {
 protected:
  FileLabelTest() { host.DeclareLabel("toolLabel", kToolId); }

  Transcript Set(const std::string& path) {
    return Record([&] { SecPolicy::SetFileLabel(path, "toolLabel", access); });
  }
  Transcript SetTree(const std::string& dir) {
    return Record([&] { SecPolicy::SetDirLabelRecursive(dir, "toolLabel", access); });
  }
  Transcript Get(const std::string& path) {
    return Record([&] { label = SecPolicy::GetFileLabel(path, access); });
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  PolicyTree tree;
  std::string label = "never read";
};

using SetFileLabel = FileLabelTest;
using GetFileLabel = FileLabelTest;
using SetDirLabelRecursive = FileLabelTest;

// ---- One entry.

TEST_F(SetFileLabel, ReplacesTheAttributeByTheIdentifier) {
  EXPECT_EQ(Set("/f").Text(), Lines({
                                  R"(LookupLabel("toolLabel", OBJECT))",
                                  R"(SetXattr("/f", "zorvan.security", 16909060, 4, 2))",
                                  R"(returns)",
                              }));
}

TEST_F(SetFileLabel, WritesFourBytesInHostOrder) {
  Set("/f");
  const std::string& value = host.attributes["/f"];
  ASSERT_EQ(value.size(), 4U);
  EXPECT_EQ(std::memcmp(value.data(), &kToolId, 4), 0);
}

TEST_F(SetFileLabel, RefusesALabelThatDoesNotExist) {
  host.DeclareLabel("toolLabel", 1);
  EXPECT_EQ(Set("/f").Text(),
            Lines({
                R"(LookupLabel("toolLabel", OBJECT))",
                R"(throws Braxo::Lib::BraxoException: Invalid label (toolLabel) for file /f)",
            }));
}

TEST_F(SetFileLabel, AcceptsTheIdentifiersNextToTheMissingOne) {
  for (const unsigned int id : {0U, 2U}) {
    host.DeclareLabel("toolLabel", id);
    EXPECT_EQ(Set("/f").Text(),
              Lines({
                  R"(LookupLabel("toolLabel", OBJECT))",
                  R"(SetXattr("/f", "zorvan.security", )" + std::to_string(id) + ", 4, 2)",
                  R"(returns)",
              }));
  }
}

TEST_F(SetFileLabel, EndsInTheSystemsTextForAFileThatNeverCarriedALabel) {
  host.FailErrno("SetXattr", "/f", ENODATA);
  EXPECT_EQ(Set("/f").Text(), Lines({
                                  Labelled("/f"),
                                  "throws Braxo::Lib::BraxoException: Unable to set file label "
                                  "(toolLabel) for file /f: No data available",
                              }));
}

TEST_F(SetFileLabel, DoesNotReportAnEarlierError) {
  host.FailErrno("SetXattr", "/f", 0);
  EXPECT_EQ(Record([&] {
              const std::string path = "/f";
              const std::string name = "toolLabel";
              errno = EPERM;
              SecPolicy::SetFileLabel(path, name, access);
            }).Text(),
            Lines({
                Labelled("/f"),
                "throws Braxo::Lib::BraxoException: Unable to set file label (toolLabel) for file "
                "/f: Success",
            }));
}

TEST_F(SetFileLabel, FailsForAnEmptyPath) {
  EXPECT_EQ(Set("").Text(), Lines({
                                Labelled(""),
                                "throws Braxo::Lib::BraxoException: Unable to set file label "
                                "(toolLabel) for file : No such file or directory",
                            }));
}

TEST_F(SetFileLabel, PassesWhatTheLookupThrows) {
  host.FailWith("LookupLabel", Every(), DerivedBraxoException("no table"));
  EXPECT_EQ(Set("/f").Text(), Lines({
                                  R"(LookupLabel("toolLabel", OBJECT))",
                                  R"(throws SecPolicyTest::DerivedBraxoException: no table)",
                              }));
  host.FailForeign("LookupLabel");
  EXPECT_EQ(Set("/f").Text(), Lines({
                                  R"(LookupLabel("toolLabel", OBJECT))",
                                  R"(throws SecPolicyTest::ForeignException: foreign)",
                              }));
}

TEST_F(GetFileLabel, ReturnsTheNameOfTheIdentifier) {
  host.SetAttribute("/f", kToolId);
  EXPECT_EQ(Get("/f").Text(), Lines({
                                  R"(GetXattr("/f", "zorvan.security", 4))",
                                  R"(GetLabel(16909060, OBJECT))",
                                  R"(returns)",
                              }));
  EXPECT_EQ(label, "toolLabel");
}

TEST_F(GetFileLabel, EndsInTheSystemsTextWithoutABlank) {
  host.FailErrno("GetXattr", "/f", ENODATA);
  EXPECT_EQ(Get("/f").Text(), Lines({
                                  R"(GetXattr("/f", "zorvan.security", 4))",
                                  "throws Braxo::Lib::BraxoException: Unable to get file label for "
                                  "file /f:No data available",
                              }));
  EXPECT_EQ(label, "never read");
}

TEST_F(GetFileLabel, DoesNotReportAnEarlierError) {
  host.FailErrno("GetXattr", "/f", 0);
  EXPECT_EQ(Record([&] {
              const std::string path = "/f";
              errno = EPERM;
              SecPolicy::GetFileLabel(path, access);
            }).Text(),
            Lines({
                R"(GetXattr("/f", "zorvan.security", 4))",
                "throws Braxo::Lib::BraxoException: Unable to get file label for file /f:Success",
            }));
}

TEST_F(GetFileLabel, FailsForAnAttributeThatDoesNotFit) {
  host.attributes["/f"] = "12345";
  EXPECT_EQ(Get("/f").Text(), Lines({
                                  R"(GetXattr("/f", "zorvan.security", 4))",
                                  "throws Braxo::Lib::BraxoException: Unable to get file label for "
                                  "file /f:Numerical result out of range",
                              }));
}

// What the attribute does not fill is zero, not what lay in memory.
TEST_F(GetFileLabel, TakesShortAttributesAsTheyAre) {
  host.attributes["/f"] = {};
  host.DeclareLabel("nullLabel", 0);
  EXPECT_EQ(Get("/f").Text(), Lines({
                                  R"(GetXattr("/f", "zorvan.security", 4))",
                                  R"(GetLabel(0, OBJECT))",
                                  R"(returns)",
                              }));
  EXPECT_EQ(label, "nullLabel");

  host.attributes["/f"] = {'\x05'};
  const std::uint32_t id = [] {
    std::uint32_t value = 0;
    std::memcpy(&value, "\x05", 1);
    return value;
  }();
  host.DeclareLabel("shortLabel", id);
  Get("/f");
  EXPECT_EQ(label, "shortLabel");
}

TEST_F(GetFileLabel, PassesWhatTheKernelThrowsForAnUnknownIdentifier) {
  host.SetAttribute("/f", kToolId);
  host.FailWith("GetLabel", Every(), DerivedBraxoException("no such label"));
  EXPECT_EQ(Get("/f").Text(), Lines({
                                  R"(GetXattr("/f", "zorvan.security", 4))",
                                  R"(GetLabel(16909060, OBJECT))",
                                  R"(throws SecPolicyTest::DerivedBraxoException: no such label)",
                              }));
  host.FailForeign("GetLabel");
  EXPECT_EQ(Get("/f").Text(), Lines({
                                  R"(GetXattr("/f", "zorvan.security", 4))",
                                  R"(GetLabel(16909060, OBJECT))",
                                  R"(throws SecPolicyTest::ForeignException: foreign)",
                              }));
}

// ---- Trees.

TEST_F(SetDirLabelRecursive, LabelsAnEmptyDirectoryOnce) {
  tree.Write("dir/", "");
  EXPECT_EQ(SetTree(tree / "dir").Text(), Lines({Labelled(tree / "dir"), "returns"}));
}

TEST_F(SetDirLabelRecursive, LabelsAFile) {
  tree.Write("dir/file", "");
  EXPECT_EQ(SetTree(tree / "dir").Text(),
            Lines({Labelled(tree / "dir"), Labelled(tree / "dir/file"), "returns"}));
}

TEST_F(SetDirLabelRecursive, LabelsAFifo) {
  tree.Write("dir/", "");
  ASSERT_EQ(mkfifo((tree / "dir/fifo").c_str(), 0600), 0);
  EXPECT_EQ(SetTree(tree / "dir").Text(),
            Lines({Labelled(tree / "dir"), Labelled(tree / "dir/fifo"), "returns"}));
}

class SetDirLabelRecursiveDevice : public FileLabelTest,
                                   public testing::WithParamInterface<mode_t> {};

TEST_P(SetDirLabelRecursiveDevice, IsLabelled) {
  tree.Write("dir/", "");
  const std::string device = tree / "dir/device";
  // The null device, as a character or as a block device.
  if (mknod(device.c_str(), GetParam() | 0600, makedev(1, 3)) != 0) {
    const int error = errno;
    GTEST_SKIP() << "skipped: devices cannot be made here: " << std::strerror(error);
  }
  EXPECT_EQ(SetTree(tree / "dir").Text(),
            Lines({Labelled(tree / "dir"), Labelled(device), "returns"}));
}

INSTANTIATE_TEST_SUITE_P(Kinds, SetDirLabelRecursiveDevice, testing::Values(S_IFCHR, S_IFBLK),
                         [](const auto& kind) {
                           return kind.param == S_IFCHR ? "Character" : "Block";
                         });

TEST_F(SetDirLabelRecursive, LabelsADirectoryInsideTwice) {
  tree.Write("dir/sub/file", "");
  EXPECT_EQ(SetTree(tree / "dir").Text(), Lines({
                                              Labelled(tree / "dir"),
                                              Labelled(tree / "dir/sub"),
                                              Labelled(tree / "dir/sub"),
                                              Labelled(tree / "dir/sub/file"),
                                              "returns",
                                          }));
}

TEST_F(SetDirLabelRecursive, TakesEntriesInListingOrder) {
  for (const char* name : {"dir/m", "dir/a", "dir/z", "dir/.hidden", "dir/..twodots", "dir/B"}) {
    tree.Write(name, "");
  }
  std::string expected = Labelled(tree / "dir") + "\n";
  for (const std::string& name : ListingOrder(tree / "dir")) {
    expected += Labelled(tree / "dir" + "/" + name) + "\n";
  }
  EXPECT_EQ(SetTree(tree / "dir").Text(), expected + "returns\n");
  EXPECT_EQ(host.attributes.size(), 7U);
}

TEST_F(SetDirLabelRecursive, ReachesEveryDepth) {
  for (const char* name : {"dir/a/b/c/deep", "dir/a/b/file", "dir/x/y", "dir/top"}) {
    tree.Write(name, "");
  }
  SetTree(tree / "dir");

  std::vector<std::string> labelled;
  for (const auto& [path, value] : host.attributes) {
    labelled.push_back(path.substr(tree.Root().size()));
  }
  EXPECT_THAT(labelled,
              UnorderedElementsAre("/dir", "/dir/a", "/dir/a/b", "/dir/a/b/c", "/dir/a/b/c/deep",
                                   "/dir/a/b/file", "/dir/x", "/dir/x/y", "/dir/top"));
}

// On a stack that one step for each level would not fit.
TEST_F(SetDirLabelRecursive, NeedsNoStackForDepth) {
  constexpr std::size_t kDepth = 900;
  std::string path = "dir/";
  for (std::size_t level = 0; level < kDepth; ++level) path += "d/";
  tree.Write(path, "");

  pthread_attr_t attributes;
  pthread_attr_init(&attributes);
  ASSERT_EQ(pthread_attr_setstacksize(&attributes, 128UL * 1024), 0);
  std::function<void()> walk = [this] { SetTree(tree / "dir"); };
  const auto run = [](void* function) -> void* {
    (*static_cast<std::function<void()>*>(function))();
    return nullptr;
  };
  pthread_t walker{};
  ASSERT_EQ(pthread_create(&walker, &attributes, run, &walk), 0);
  pthread_join(walker, nullptr);
  pthread_attr_destroy(&attributes);
  EXPECT_EQ(host.attributes.size(), kDepth + 1);
}

TEST_F(SetDirLabelRecursive, KeepsTheDoubledSlashOfAPathThatEndsInOne) {
  tree.Write("dir/sub/file", "");
  EXPECT_EQ(SetTree(tree / "dir/").Text(), Lines({
                                               Labelled(tree / "dir/"),
                                               Labelled(tree / "dir//sub"),
                                               Labelled(tree / "dir//sub"),
                                               Labelled(tree / "dir//sub/file"),
                                               "returns",
                                           }));
}

TEST_F(SetDirLabelRecursive, NeitherLabelsNorFollowsLinks) {
  tree.Write("target/file", "");
  tree.Write("dir/", "");
  namespace fs = std::filesystem;
  fs::create_directory_symlink(tree / "target", tree / "dir/toDirectory");
  fs::create_symlink(tree / "target/file", tree / "dir/toFile");
  fs::create_symlink(tree / "nowhere", tree / "dir/toNothing");
  fs::create_directory_symlink(tree / "dir", tree / "dir/toItself");
  EXPECT_EQ(SetTree(tree / "dir").Text(), Lines({Labelled(tree / "dir"), "returns"}));
}

TEST_F(SetDirLabelRecursive, FollowsALinkThatItIsGiven) {
  tree.Write("dir/file", "");
  std::filesystem::create_directory_symlink(tree / "dir", tree / "link");
  EXPECT_EQ(SetTree(tree / "link").Text(),
            Lines({Labelled(tree / "link"), Labelled(tree / "link/file"), "returns"}));
}

TEST_F(SetDirLabelRecursive, PassesOverSockets) {
  tree.Write("dir/", "");
  sockaddr_un address = {.sun_family = AF_UNIX, .sun_path = {}};
  const std::string path = tree / "dir/socket";
  path.copy(address.sun_path, sizeof address.sun_path - 1);
  const int descriptor = socket(AF_UNIX, SOCK_STREAM, 0);
  ASSERT_EQ(bind(descriptor, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
  close(descriptor);
  EXPECT_EQ(SetTree(tree / "dir").Text(), Lines({Labelled(tree / "dir"), "returns"}));
}

TEST_F(SetDirLabelRecursive, PassesOverEntriesOfUnknownType) {
  tree.Write("dir/file", "");
  const UntypedEntry untyped("file");
  EXPECT_EQ(SetTree(tree / "dir").Text(), Lines({Labelled(tree / "dir"), "returns"}));
}

TEST_F(SetDirLabelRecursive, LabelsAFileBeforeItFailsToOpenIt) {
  tree.Write("file", "");
  EXPECT_EQ(SetTree(tree / "file").Text(),
            Lines({
                Labelled(tree / "file"),
                "throws Braxo::Lib::BraxoException: Unable to open directory " + tree / "file",
            }));
}

TEST_F(SetDirLabelRecursive, DoesNotOpenADirectoryThatCannotBeLabelled) {
  host.FailErrno("SetXattr", tree / "none", ENOENT);
  EXPECT_EQ(SetTree(tree / "none").Text(),
            Lines({
                Labelled(tree / "none"),
                "throws Braxo::Lib::BraxoException: Unable to set file label (toolLabel) for "
                "file " +
                    tree / "none" + ": No such file or directory",
            }));
}

TEST_F(SetDirLabelRecursive, EndsAtTheFirstEntryThatFails) {
  for (const char* name : {"dir/a", "dir/b", "dir/c"}) tree.Write(name, "");
  const std::vector<std::string> names = ListingOrder(tree / "dir");
  const std::string failing = tree / "dir/" + names[1];
  host.FailErrno("SetXattr", failing, EROFS);
  EXPECT_EQ(SetTree(tree / "dir").Text(),
            Lines({
                Labelled(tree / "dir"),
                Labelled(tree / "dir/" + names[0]),
                Labelled(failing),
                "throws Braxo::Lib::BraxoException: Unable to set file label (toolLabel) for "
                "file " +
                    failing + ": Read-only file system",
            }));
}

TEST_F(SetDirLabelRecursive, LeavesTheEnclosingDirectoriesAsTheyAre) {
  for (const char* name : {"dir/a/inner", "dir/b/inner", "dir/c/inner"}) tree.Write(name, "");
  const std::vector<std::string> names = ListingOrder(tree / "dir");
  const std::string failing = tree / "dir/" + names[1] + "/inner";
  host.FailErrno("SetXattr", failing, EACCES);
  const unsigned int openBefore = OpenDescriptors();

  EXPECT_EQ(SetTree(tree / "dir").Text(),
            Lines({
                Labelled(tree / "dir"),
                Labelled(tree / "dir/" + names[0]),
                Labelled(tree / "dir/" + names[0]),
                Labelled(tree / "dir/" + names[0] + "/inner"),
                Labelled(tree / "dir/" + names[1]),
                Labelled(tree / "dir/" + names[1]),
                Labelled(failing),
                "throws Braxo::Lib::BraxoException: Unable to set file label (toolLabel) for "
                "file " +
                    failing + ": Permission denied",
            }));
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

TEST_F(SetDirLabelRecursive, ClosesEveryDirectory) {
  tree.Write("dir/a/b/c/deep", "");
  const unsigned int openBefore = OpenDescriptors();
  EXPECT_EQ(SetTree(tree / "dir").exceptionType, "");
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

TEST_F(SetDirLabelRecursive, PassesExceptionsAsTheyAreAndClosesItsDirectories) {
  tree.Write("dir/sub/file", "");
  const unsigned int openBefore = OpenDescriptors();
  host.FailWith("LookupLabel", Nth(4), DerivedBraxoException("no table"));
  host.FailForeign("LookupLabel", Nth(8));
  const auto expected = [&](const std::string& end) {
    return Lines({
        Labelled(tree / "dir"),
        Labelled(tree / "dir/sub"),
        Labelled(tree / "dir/sub"),
        R"(LookupLabel("toolLabel", OBJECT))",
        end,
    });
  };
  EXPECT_EQ(SetTree(tree / "dir").Text(),
            expected("throws SecPolicyTest::DerivedBraxoException: no table"));
  EXPECT_EQ(SetTree(tree / "dir").Text(),
            expected("throws SecPolicyTest::ForeignException: foreign"));
  EXPECT_EQ(OpenDescriptors(), openBefore);
}

}  // namespace
}  // namespace SecPolicyTest
