// Levels and their words: hunts for a word that is taken for another level, or for none.

#include "policy/level.h"

#include <gtest/gtest.h>

namespace PolicyTest {
namespace {

using Policy::FindLevel;
using Policy::Level;

struct LevelWord {
  Level level;
  const char* word;
};

constexpr LevelWord kLevelWords[] = {{Level::kEnforcing, "enforcing"},
                                     {Level::kPermissive, "permissive"},
                                     {Level::kDisabled, "disabled"}};

TEST(Level, HasAWord) {
  ASSERT_EQ(std::size(kLevelWords), Policy::kLevels.size());
  for (const auto& [level, word] : kLevelWords) {
    EXPECT_STREQ(Policy::TextOf(level), word);
    EXPECT_EQ(FindLevel(word), level) << word;
  }
}

TEST(Level, IsNoOtherWord) {
  for (const char* word : {"", "Enforcing", "enforcin", "enforcing ", "off"}) {
    EXPECT_EQ(FindLevel(word), std::nullopt) << word;
  }
}

}  // namespace
}  // namespace PolicyTest
