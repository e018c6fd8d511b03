// What a bundle consists of, byte by byte.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "bundle/archive.h"
#include "bundle/manifest.h"
#include "bundle/policy_exchange.h"
#include "bundle/policy_tree.h"
#include "support/message_of.h"
#include "support/temporary_directory.h"

namespace SecPolicyCli {
namespace {

const std::vector<ArchiveEntry> kEntries = {
    {"empty", ""}, {"block", std::string(512, 'b')}, {"more", std::string(513, '\0')}};

bool IsTaken(const std::string& archive) {
  try {
    return ReadArchive(archive) == kEntries;
  } catch (const BadArchive&) {
    return false;
  }
}

TEST(BundleArchive, HoldsWhatWasWritten) {
  EXPECT_EQ(ReadArchive(WriteArchive(kEntries)), kEntries);
  EXPECT_EQ(ReadArchive(WriteArchive({})), std::vector<ArchiveEntry>{});
  const std::vector<ArchiveEntry> longest = {{std::string(kLongestEntryName, 'n'), "x"}};
  EXPECT_EQ(ReadArchive(WriteArchive(longest)), longest);
}

TEST(BundleArchive, IsNotTakenCutOrContinued) {
  const std::string archive = WriteArchive(kEntries);
  for (std::size_t size = 0; size < archive.size(); ++size) {
    EXPECT_FALSE(IsTaken(archive.substr(0, size))) << size;
  }
  EXPECT_FALSE(IsTaken(archive + '\0'));
  EXPECT_FALSE(IsTaken(archive + WriteArchive(kEntries)));
}

// Of content the digests tell.
TEST(BundleArchive, HasNoByteThatDoesNotMatter) {
  const std::string archive = WriteArchive(kEntries);
  for (std::size_t index = 0; index < archive.size(); ++index) {
    std::string changed = archive;
    changed[index] ^= 1;
    EXPECT_FALSE(IsTaken(changed)) << index;
  }
}

TEST(BundleManifest, SaysWhatWasWritten) {
  const Manifest manifest{.name = "web",
                          .serial = 7,
                          .created = 1700000000,
                          .expires = 1800000000,
                          .key = "0123456789abcdef",
                          .files = {{.path = "objects/base", .size = 3, .digest = "aa"}}};
  EXPECT_EQ(ReadManifest(ToJson(manifest).Text()), manifest);
  Manifest endless = manifest;
  endless.expires.reset();
  EXPECT_EQ(ReadManifest(ToJson(endless).Text()), endless);
}

TEST(BundleManifest, HasDaysThatThereAre) {
  EXPECT_EQ(ReadUtcTime("1970-01-02"), 86400);
  EXPECT_EQ(ReadUtcTime("2026-11-21T07:00:00Z"), 1795244400);
  EXPECT_EQ(ReadUtcTime("2026-11-21 07:00:00 UTC"), 1795244400);
  for (const char* const text :
       {"", "2026-02-30", "2026-13-01", "2026-11-21x", "1960-01-01", "7"}) {
    EXPECT_EQ(ReadUtcTime(text), std::nullopt) << text;
  }
}

TEST(BundledPolicy, IsWrittenIntoNothingThatIsThere) {
  const SecPolicyTest::TemporaryDirectory parent;
  const std::string there = parent / "policy";
  std::filesystem::create_directory(there);
  EXPECT_EQ(SecPolicyTest::MessageOf([&] { WritePolicyTree(there, kEntries); }),
            "cannot write " + there + ": File exists");
  EXPECT_TRUE(std::filesystem::is_empty(there));
}

TEST(BundledPolicy, HasNamesThatALoadReads) {
  for (const char* const name : {"objects/base", "domains/a", "domains/plugins/a", "tardisks/a",
                                 "fileLabels/a~b", "early/domains/a"}) {
    EXPECT_TRUE(IsPolicyFile(name)) << name;
  }
  for (const char* const name :
       {"", "objects", "objects/", "/objects/a", "objects/../a", "objects/..", "objects/.hidden",
        "objects//a", "other/a", "early/objects/a", "domains/plugins/x/a", "objects/a b",
        "objects/a\\b", "objects/a\n", "objects/\xc3\xa4"}) {
    EXPECT_FALSE(IsPolicyFile(name)) << name;
  }
  EXPECT_TRUE(IsPolicyFile("objects/" + std::string(85, 'n')));
  EXPECT_FALSE(IsPolicyFile("objects/" + std::string(86, 'n')));
}

}  // namespace
}  // namespace SecPolicyCli
