// Two policies compared: hunts for a difference that is missed, told twice or told the wrong way
// round.

#include "policy/difference.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace PolicyTest {
namespace {

using Policy::Compare;
using Policy::Difference;
using Policy::DomainDifference;
using Policy::InstalledDomain;
using Policy::InstalledPolicy;
using Policy::Level;
using Policy::Permissions;
using Policy::Rule;
using Policy::RuleKind;
using testing::ElementsAre;

Rule Call(const std::string& call, bool grant = true) {
  return {.kind = RuleKind::kSyscall, .words = {call}, .verdict = grant};
}

Rule Path(const std::string& path, const char* letters) {
  return {.kind = RuleKind::kFilePath, .words = {path}, .verdict = Permissions::Parse(letters)};
}

InstalledDomain Domain(const std::string& name, std::vector<Rule> rules = {},
                       Level level = Level::kEnforcing) {
  InstalledDomain domain;
  domain.name = name;
  domain.level = level;
  domain.rules = std::move(rules);
  return domain;
}

// "- RULE", "+ RULE" and "RULE -> RULE" of a domain that is on both sides.
std::vector<std::string> CompareRules(std::vector<Rule> before, std::vector<Rule> after) {
  const Difference difference =
      Compare({.domains = {Domain("a", std::move(before))}, .objects = {}},
              {.domains = {Domain("a", std::move(after))}, .objects = {}});
  std::vector<std::string> lines;
  for (const DomainDifference& domain : difference.domains) {
    for (const Rule& rule : domain.removed) lines.push_back("- " + rule.Text());
    for (const Rule& rule : domain.added) lines.push_back("+ " + rule.Text());
    for (const auto& change : domain.changed) {
      lines.push_back(change.before.Text() + " -> " + change.after.Text());
    }
  }
  return lines;
}

TEST(CompareRules, TellsWhatIsOnOneSideAndWhatDecidesOtherwise) {
  struct Row {
    const char* name;
    std::vector<Rule> before, after;
    std::vector<std::string> lines;
  };
  const Row rows[] = {
      {"nothing", {}, {}, {}},
      {"the same", {Call("bind")}, {Call("bind")}, {}},
      {"in another order", {Call("bind"), Call("read")}, {Call("read"), Call("bind")}, {}},
      {"removed", {Call("bind")}, {}, {"- -s bind grant"}},
      {"added", {}, {Call("bind")}, {"+ -s bind grant"}},
      {"changed", {Call("bind")}, {Call("bind", false)}, {"-s bind grant -> -s bind revoke"}},
      {"permissions", {Path("/a", "rw")}, {Path("/a", "")}, {"-r /a rw -> -r /a "}},
      {"in the order of kinds and words",
       {Call("b"), Call("d"), Path("/a", "r"), Call("a", false)},
       {Call("c"), Call("d", false), Path("/", "r"), Call("a")},
       {"- -r /a r", "- -s b grant", "+ -r / r", "+ -s c grant", "-s a revoke -> -s a grant",
        "-s d grant -> -s d revoke"}},
  };
  for (const auto& [name, before, after, lines] : rows) {
    EXPECT_EQ(CompareRules(before, after), lines) << name;
  }
}

TEST(CompareRules, PassesOverLinesAndPlaces) {
  Rule moved = Call("bind");
  moved.line = 7;
  moved.origin = {.file = "/etc/a", .line = 7, .isGone = true};
  EXPECT_THAT(CompareRules({Call("bind")}, {moved}), ElementsAre());
}

TEST(Compare, TellsDomainsOfOneSideWithTheirRules) {
  const Difference difference =
      Compare({.domains = {Domain("gone", {Call("bind")}), Domain("same")}, .objects = {}},
              {.domains = {Domain("same"), Domain("new", {Call("read")}, Level::kDisabled)},
               .objects = {}});
  ASSERT_EQ(difference.domains.size(), 2U);
  const DomainDifference& gone = difference.domains[0];
  EXPECT_EQ(gone.name, "gone");
  EXPECT_TRUE(gone.IsGone());
  EXPECT_FALSE(gone.IsNew());
  EXPECT_EQ(gone.levelBefore, Level::kEnforcing);
  EXPECT_EQ(gone.removed.size(), 1U);
  const DomainDifference& made = difference.domains[1];
  EXPECT_EQ(made.name, "new");
  EXPECT_TRUE(made.IsNew());
  EXPECT_FALSE(made.IsGone());
  EXPECT_EQ(made.levelAfter, Level::kDisabled);
  EXPECT_EQ(made.added.size(), 1U);
}

TEST(Compare, TellsLevelsButNoNumbers) {
  InstalledDomain other = Domain("a");
  other.id = 7;
  other.references = 3;
  EXPECT_TRUE(
      Compare({.domains = {Domain("a")}, .objects = {}}, {.domains = {other}, .objects = {}})
          .IsEmpty());
  other.level = Level::kPermissive;
  const Difference difference =
      Compare({.domains = {Domain("a")}, .objects = {}}, {.domains = {other}, .objects = {}});
  ASSERT_EQ(difference.domains.size(), 1U);
  EXPECT_EQ(difference.domains[0].levelBefore, Level::kEnforcing);
  EXPECT_EQ(difference.domains[0].levelAfter, Level::kPermissive);
}

TEST(Compare, TellsObjectsByName) {
  const InstalledPolicy before = {.domains = {}, .objects = {{"a", 4}, {"b", 5}}};
  const InstalledPolicy after = {.domains = {}, .objects = {{"b", 9}, {"c", 4}, {"d", 5}}};
  const Difference difference = Compare(before, after);
  EXPECT_THAT(difference.objectsRemoved, ElementsAre("a"));
  EXPECT_THAT(difference.objectsAdded, ElementsAre("c", "d"));
  EXPECT_FALSE(difference.IsEmpty());
  EXPECT_TRUE(Compare(before, before).IsEmpty());
}

}  // namespace
}  // namespace PolicyTest
