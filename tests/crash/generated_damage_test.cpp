// Damaged states by the hundred, each from a seed: every verb ends, in time and without a crash, a
// boot mends what it finds, and no damaged saved state is ever installed.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "command.h"
#include "host_root.h"
#include "state_content.h"

namespace CrashTest {
namespace {

constexpr std::size_t kPage = 4096;

using Random = std::mt19937;

std::size_t Below(Random& random, std::size_t bound) {
  return std::uniform_int_distribution<std::size_t>(0, bound - 1)(random);
}

void FlipBit(std::string& content, std::size_t at, Random& random) {
  content[at] = static_cast<char>(content[at] ^ (1 << Below(random, 8)));
}

void Change(const std::filesystem::path& state,
            const std::function<void(std::string& content)>& change) {
  std::string content = ReadFile(state);
  change(content);
  WriteFile(state, content);
}

constexpr std::array kTables = {"state",       "domain",       "role",           "guest_service",
                                "label",       "rule",         "parameter_rule", "file_policy",
                                "world",       "inode_origin", "rule_origin",    "label_origin",
                                "load_record", "load_error"};

std::string AnyTable(Random& random) { return kTables[Below(random, kTables.size())]; }

// One way to damage a state.
struct Damage {
  const char* name;
  void (*make)(const std::filesystem::path& state, Random& random);
  bool isForeign = false;  // others may have written it: not to be mended, but to be refused
};

const std::array kDamages = {
    Damage{"bits anywhere",
           [](const auto& state, Random& random) {
             Change(state, [&](std::string& content) {
               for (std::size_t count = 1 + Below(random, 8); count > 0; --count) {
                 FlipBit(content, Below(random, content.size()), random);
               }
             });
           }},
    Damage{"a bit of the head",
           [](const auto& state, Random& random) {
             Change(state,
                    [&](std::string& content) { FlipBit(content, Below(random, 100), random); });
           }},
    Damage{"the head of a page",
           [](const auto& state, Random& random) {
             Change(state, [&](std::string& content) {
               const std::size_t page = Below(random, content.size() / kPage);
               FlipBit(content, page * kPage + Below(random, 16), random);
             });
           }},
    Damage{"a cut",
           [](const auto& state, Random& random) {
             std::filesystem::resize_file(state, Below(random, std::filesystem::file_size(state)));
           }},
    Damage{"a page of zeros",
           [](const auto& state, Random& random) {
             Change(state, [&](std::string& content) {
               const std::size_t page = Below(random, content.size() / kPage);
               content.replace(page * kPage, kPage, kPage, '\0');
             });
           }},
    Damage{"a page in another's place",
           [](const auto& state, Random& random) {
             Change(state, [&](std::string& content) {
               const std::size_t from = Below(random, content.size() / kPage);
               const std::size_t to = Below(random, content.size() / kPage);
               content.replace(to * kPage, kPage, content.substr(from * kPage, kPage));
             });
           }},
    Damage{"rows that are gone",
           [](const auto& state, Random& random) {
             StateFile(state).Execute("DELETE FROM " + AnyTable(random));
           }},
    Damage{"a table that is gone",
           [](const auto& state, Random& random) {
             StateFile(state).Execute("DROP TABLE " + AnyTable(random));
           }},
    Damage{"the log of another state",
           [](const auto& state, Random& random) {
             const std::filesystem::path other = state.string() + ".other";
             std::filesystem::copy_file(state, other);
             {
               const StateFile file(other);
               for (std::size_t count = 1 + Below(random, 4); count > 0; --count) {
                 file.Execute("DELETE FROM " + AnyTable(random));
               }
               std::filesystem::copy_file(other.string() + "-wal", state.string() + "-wal");
             }
             std::filesystem::remove(other);
           }},
    Damage{"bytes of something else",
           [](const auto& state, Random& random) {
             WriteFile(state, std::string(1 + Below(random, 9000), 'x'));
           }},
    Damage{"others who may write it",
           [](const auto& state, Random& /*random*/) {
             std::filesystem::permissions(state, std::filesystem::perms(0666));
           },
           true},
    Damage{"another owner",
           [](const auto& state, Random& /*random*/) {
             if (chown(state.c_str(), 12345, 12345) != 0) std::filesystem::remove(state);
           },
           true},
};

const std::vector<std::vector<std::string>> kVerbs = {
    {"status"},
    {"display"},
    {"check"},
    {"load"},
    {"load", "--plan"},
    {"load", "--all-or-nothing"},
    {"load-early"},
    {"diff", "installed", "/etc/zorvan/secpolicy"},
    {"save", "--force", "copy"},
    {"rollback", "good"},
    {"why", "service0", "call", "bind"},
    {"who-can", "call", "bind"},
    {"label", "verify"},
};

std::string Joined(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += word + " ";
  return text;
}

void ExpectGoodEnd(const std::vector<std::string>& verb, const Outcome& outcome) {
  EXPECT_GE(outcome.exitStatus, 0) << Joined(verb) << "was ended by a signal";
  EXPECT_LE(outcome.exitStatus, 3) << Joined(verb);
  if (outcome.exitStatus != 0) {
    EXPECT_FALSE(outcome.output.empty() && outcome.errors.empty()) << Joined(verb);
  }
}

class GeneratedDamage : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_EQ(RunCommand(root.Path(), {"boot"}).exitStatus, 0);
    ASSERT_EQ(RunCommand(root.Path(), {"save", "good"}).exitStatus, 0);
    content = ContentOf(root.State());
    whole = ReadFile(root.State());
  }

  // Puts a file with this content in the place of the state, and nothing beside it.
  void InstallState(const std::string& bytes) const {
    std::filesystem::remove_all(root.State().parent_path());
    std::filesystem::create_directory(root.State().parent_path());
    std::filesystem::permissions(root.State().parent_path(), std::filesystem::perms::owner_all);
    WriteFile(root.State(), bytes);
    std::filesystem::permissions(root.State(), std::filesystem::perms(0600));
  }

  std::filesystem::path Saved() const { return root.Path() / "var/lib/secpolicy/saved/good.db"; }

  static std::size_t Rounds() {
    const char* const wanted = std::getenv("SECPOLICY_DAMAGED_STATES");
    return wanted != nullptr ? std::stoul(wanted) : LongTests() ? 3000 : 65;
  }

  const HostRoot root;
  std::string content;
  std::string whole;
};

TEST_F(GeneratedDamage, IsEndedWellByEveryVerbAndMendedByABoot) {
  for (std::size_t seed = 0; seed < Rounds() && !HasFailure(); ++seed) {
    Random random(static_cast<unsigned int>(seed));
    const Damage& damage = kDamages[seed % kDamages.size()];
    SCOPED_TRACE(std::string(damage.name) + ", seed " + std::to_string(seed));
    InstallState(whole);
    damage.make(root.State(), random);
    for (int count = 0; count < 3; ++count) {
      const auto& verb = kVerbs[Below(random, kVerbs.size())];
      ExpectGoodEnd(verb, RunCommand(root.Path(), verb));
    }
    if (damage.isForeign && std::filesystem::exists(root.State())) {
      const Outcome refused = RunCommand(root.Path(), {"boot"});
      EXPECT_EQ(refused.exitStatus, 1);
      EXPECT_THAT(refused.errors, ::testing::HasSubstr("Refusing the host state"));
      std::filesystem::remove(root.State());
    }
    const Outcome boot = RunCommand(root.Path(), {"boot"});
    EXPECT_EQ(boot.exitStatus, 0) << boot.errors;
    EXPECT_EQ(StateFile(root.State()).Integrity(), "ok");
    EXPECT_EQ(ContentOf(root.State()), content);
    EXPECT_EQ(RunCommand(root.Path(), {"status"}).exitStatus, 0);
  }
}

TEST_F(GeneratedDamage, OfASavedStateIsNeverInstalled) {
  const std::string sound = ReadFile(Saved());
  InstallState(whole);
  StateFile(root.State()).Execute("DELETE FROM rule");
  const std::string changed = ReadFile(root.State());
  const std::string changedContent = ContentOf(root.State());
  std::size_t refused = 0;
  for (std::size_t seed = 0; seed < Rounds() && !HasFailure(); ++seed) {
    Random random(static_cast<unsigned int>(seed));
    const Damage& damage = kDamages[seed % kDamages.size()];
    SCOPED_TRACE(std::string(damage.name) + ", seed " + std::to_string(seed));
    InstallState(changed);
    std::filesystem::remove(Saved());
    std::filesystem::remove(Saved().string() + "-wal");
    WriteFile(Saved(), sound);
    std::filesystem::permissions(Saved(), std::filesystem::perms(0600));
    damage.make(Saved(), random);
    const Outcome rollback = RunCommand(root.Path(), {"rollback", "good"});
    ExpectGoodEnd({"rollback"}, rollback);
    // Bytes that hold nothing may have any value.
    EXPECT_EQ(ContentOf(root.State()), rollback.exitStatus == 0 ? content : changedContent);
    if (rollback.exitStatus != 0) ++refused;
  }
  EXPECT_GT(refused, 0U);
}

}  // namespace
}  // namespace CrashTest
