// Policy files without line ends or without end, devices in their place, and names of any bytes:
// how much memory they take.

#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <sstream>

#include "hostile_tree.h"
#include "run_child.h"
#include "support/message_of.h"

namespace HostileTest {
namespace {

using SecPolicyTest::MessageOf;
using Parsed = std::map<unsigned int, std::queue<std::string>>;

constexpr unsigned long kMebibyte = 1UL << 20;

class HostilePolicyFile : public HostileTree {
 protected:
  // Writes a file of `size` bytes, `text` over and over; returns its path.
  std::string Write(const std::string& text, unsigned long size) const {
    std::string block;
    while (block.size() < kMebibyte) block += text;
    std::string path = *this / "policy";
    std::ofstream file(path, std::ios::binary);
    for (; size > block.size(); size -= block.size()) file << block;
    file << block.substr(0, size);
    return path;
  }
};

struct Reading {
  unsigned long lines = 0;
  unsigned long peakKilobytes = 0;
};

Reading Read(const std::string& path) {
  const ChildOutcome outcome = RunChild({"parse", path});
  EXPECT_EQ(outcome.status, 0) << outcome.output;
  Reading reading;
  std::istringstream(outcome.output) >> reading.lines >> reading.peakKilobytes;
  return reading;
}

// What reading takes beyond an empty file, with room for the allocator's moods.
void ExpectNoMoreMemoryThanForAnEmptyFile(const Reading& reading) {
  const Reading empty = Read("/dev/null");
  EXPECT_LT(reading.peakKilobytes, empty.peakKilobytes + 4096);
}

TEST_F(HostilePolicyFile, WithoutLineFeedIsNotReadIntoMemory) {
  const Reading reading = Read(Write("a", (LongRun() ? 1024 : 64) * kMebibyte));

  EXPECT_EQ(reading.lines, 1U);
  ExpectNoMoreMemoryThanForAnEmptyFile(reading);
}

TEST_F(HostilePolicyFile, OfLinesWithoutWordsIsNotKept) {
  const unsigned long lines = LongRun() ? 50'000'000 : 1'000'000;
  const Reading reading = Read(Write("#\n", 2 * lines));

  EXPECT_EQ(reading.lines, 0U);
  ExpectNoMoreMemoryThanForAnEmptyFile(reading);
}

TEST_F(HostilePolicyFile, OfLinesWithWordsTakesMemoryForEach) {
  constexpr unsigned long kLines = 200'000;
  const Reading reading = Read(Write("a\n", 2 * kLines));

  EXPECT_EQ(reading.lines, kLines);
  // A line with a word is about 700 bytes, more with a sanitizer; most of it is its empty queue.
  EXPECT_LT(reading.peakKilobytes, 2 * kLines);
}

TEST_F(HostilePolicyFile, ThatDoesNotFitIntoMemoryEndsInBadAlloc) {
#ifdef SECPOLICY_SANITIZE
  GTEST_SKIP() << "the address space cannot be limited under AddressSanitizer";
#endif
  const unsigned long lines = LongRun() ? 50'000'000 : 1'000'000;
  const char* const mebibytes = LongRun() ? "4096" : "256";

  const ChildOutcome outcome = RunChild({"parse", Write("a\n", 2 * lines), mebibytes});

  EXPECT_TRUE(WIFEXITED(outcome.status));
  EXPECT_EQ(outcome.output, "out of memory\n");
}

TEST_F(HostilePolicyFile, ThatIsADeviceEnds) {
  Parsed parsed;
  SecPolicy::ParseFile("/dev/zero", parsed);
  SecPolicy::ParseFile("/dev/null", parsed);
  EXPECT_TRUE(parsed.empty());
}

TEST_F(HostilePolicyFile, ThatIsADirectoryHasNoLines) {
  Parsed parsed;
  SecPolicy::ParseFile(Tree(), parsed);
  EXPECT_TRUE(parsed.empty());
}

TEST_F(HostilePolicyFile, BeyondTheGreatestPathIsRefused) {
  const std::string path = "/" + std::string(5000, 'p');
  Parsed parsed;
  std::map<std::string, std::string> files;
  EXPECT_EQ(MessageOf([&] { SecPolicy::ParseFile(path, parsed); }),
            "Unable to open policy file " + path);
  EXPECT_EQ(MessageOf([&] { SecPolicy::GetFileList(path, files); }),
            "Unable to open policy directory " + path);
}

TEST_F(HostilePolicyFile, MayHaveAnyName) {
  const std::string names[] = {"line\nfeed", "\xff\xfe", " ", "#", "%s%n"};
  for (const std::string& name : names) std::ofstream(*this / name) << "toolLabel\n";
  mkfifo((*this / "a pipe, which would never end").c_str(), 0600);

  std::map<std::string, std::string> files;
  SecPolicy::GetFileList(Tree(), files);

  EXPECT_EQ(files.size(), std::size(names));
  for (const std::string& name : names) EXPECT_EQ(files[*this / name], name);
}

}  // namespace
}  // namespace HostileTest
