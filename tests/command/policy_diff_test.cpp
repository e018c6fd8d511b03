// Hunts differences between two policies that are not told, told twice, or told of what is the
// same.

#include "compare/policy_diff.h"

#include <gtest/gtest.h>

#include <map>
#include <optional>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

namespace {

using Policy::InstalledDomain;
using Policy::Level;
using Policy::Permissions;
using Policy::Rule;
using Policy::RuleKind;
using SecPolicyCli::Side;

using Labels = std::map<std::string, std::string>;

Rule Syscall(const std::string& name, bool grant) {
  return {.kind = RuleKind::kSyscall, .words = {name}, .verdict = grant};
}

Rule Path(const std::string& path, const char* letters) {
  return {.kind = RuleKind::kFilePath, .words = {path}, .verdict = Permissions::Parse(letters)};
}

InstalledDomain Domain(const std::string& name, std::vector<Rule> rules,
                       Level level = Level::kEnforcing) {
  InstalledDomain domain;
  domain.name = name;
  domain.level = level;
  domain.rules = std::move(rules);
  return domain;
}

Side Of(const std::string& name, std::vector<InstalledDomain> domains,
        std::map<std::string, unsigned int> objects = {}, Labels labels = {}) {
  return {.name = name,
          .policy = {.domains = std::move(domains), .objects = std::move(objects)},
          .labels = std::move(labels)};
}

std::string DiffText(Side before, Side after) {
  std::ostringstream output;
  WriteDiffText(SecPolicyCli::Diff(std::move(before), std::move(after)), output);
  return output.str();
}

TEST(PolicyDiff, OfTheSameIsEmptyWhateverTheirNumbersAndOrigins) {
  Side before = Of("a", {Domain("dom", {Syscall("bind", true)})}, {{"tool", 8}}, {{"/f", "tool"}});
  Side after = Of("b", {Domain("dom", {Syscall("bind", true)})}, {{"tool", 9}}, {{"/f", "tool"}});
  after.policy.domains.front().id = 7;
  after.policy.domains.front().rules.front().line = 3;
  after.policy.domains.front().rules.front().origin.file = "/policy/domains/dom";
  EXPECT_TRUE(SecPolicyCli::Diff(before, after).IsSame());
  EXPECT_EQ(DiffText(before, after), "");
}

TEST(PolicyDiff, TellsAChangeBesideWhatItChanges) {
  EXPECT_EQ(DiffText(Of("old", {Domain("dom", {Syscall("bind", true), Path("/etc", "r")})}),
                     Of("new", {Domain("dom", {Syscall("bind", false), Path("/etc", "rw")},
                                       Level::kPermissive)})),
            "--- old\n+++ new\n@@ domain dom\n- level enforcing\n+ level permissive\n"
            "- -r /etc r\n+ -r /etc rw\n- -s bind grant\n+ -s bind revoke\n");
}

TEST(PolicyDiff, TellsDomainsThatOnlyOneSideHas) {
  EXPECT_EQ(DiffText(Of("old", {Domain("gone", {})}),
                     Of("new", {Domain("made", {Syscall("bind", true)})})),
            "--- old\n+++ new\n@@ domain gone (only in old)\n- level enforcing\n"
            "@@ domain made (only in new)\n+ level enforcing\n+ -s bind grant\n");
}

TEST(PolicyDiff, TellsObjectsAndLabels) {
  EXPECT_EQ(
      DiffText(Of("old", {}, {{"a", 8}, {"b", 9}}, {{"/f", "a"}, {"/g", "a"}, {"/h", "b"}}),
               Of("new", {}, {{"b", 8}, {"c\x1b", 9}}, {{"/f", "b"}, {"/h", "b"}, {"/i", "b"}})),
      "--- old\n+++ new\n@@ objects\n- a\n+ c^[\n"
      "@@ file labels\n- /f a\n+ /f b\n- /g a\n+ /i b\n");
}

TEST(PolicyDiff, HasNoLabelsOfTwoStates) {
  Side before = Of("old", {}, {{"a", 8}});
  Side after = Of("new", {}, {});
  before.labels.reset();
  after.labels.reset();
  const SecPolicyCli::Comparison diff = SecPolicyCli::Diff(before, after);
  EXPECT_FALSE(diff.labels.has_value());
  EXPECT_FALSE(diff.IsSame());
}

}  // namespace
