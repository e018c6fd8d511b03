// Hunts ways that no transitions lead, ways that are not the shortest, and searches without an end.

#include "policy/way.h"

#include <gmock/gmock.h>

namespace PolicyTest {
namespace {

using Policy::FindWay;
using Policy::InstalledDomain;
using Policy::InstalledPolicy;
using Policy::Rule;
using Policy::RuleKind;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Optional;

Rule Into(const std::string& target, bool grant = true, const std::string& label = "program") {
  return {.kind = RuleKind::kDomainTransition, .words = {label, target, "exec"}, .verdict = grant};
}

InstalledDomain Domain(const std::string& name, std::vector<Rule> rules = {}) {
  InstalledDomain domain;
  domain.name = name;
  domain.rules = std::move(rules);
  return domain;
}

// "a -LABEL-> b" for each step; nothing when there is no way.
std::optional<std::vector<std::string>> Steps(std::vector<InstalledDomain> domains,
                                              const std::string& from, const std::string& to) {
  const InstalledPolicy policy{.domains = std::move(domains), .objects = {}};
  const auto way = FindWay(policy, from, to);
  if (!way) return std::nullopt;
  std::vector<std::string> steps;
  for (const Policy::Step& step : *way) {
    steps.push_back(step.from + " -" + step.rule.words[0] + "-> " + step.To());
  }
  return steps;
}

TEST(FindWay, TakesTheFewestTransitions) {
  EXPECT_THAT(Steps({Domain("a", {Into("b"), Into("c")}), Domain("b", {Into("d")}),
                     Domain("c", {Into("e")}), Domain("d", {Into("e")}), Domain("e")},
                    "a", "e"),
              Optional(ElementsAre("a -program-> c", "c -program-> e")));
}

TEST(FindWay, NamesTheFirstRuleOfSeveral) {
  EXPECT_THAT(Steps({Domain("a", {Into("b", true, "one"), Into("b", true, "two")})}, "a", "b"),
              Optional(ElementsAre("a -one-> b")));
}

TEST(FindWay, GoesRoundNoCircle) {
  const std::vector<InstalledDomain> circle = {Domain("a", {Into("b"), Into("a")}),
                                               Domain("b", {Into("a"), Into("b")}), Domain("c")};
  EXPECT_EQ(Steps(circle, "a", "c"), std::nullopt);
  EXPECT_THAT(Steps(circle, "b", "a"), Optional(ElementsAre("b -program-> a")));
}

TEST(FindWay, TakesNoTransitionThatIsRevoked) {
  EXPECT_EQ(Steps({Domain("a", {Into("b", false)}), Domain("b")}, "a", "b"), std::nullopt);
  EXPECT_THAT(Steps({Domain("a", {Into("b", false, "one"), Into("b", true, "two")})}, "a", "b"),
              Optional(ElementsAre("a -two-> b")));
}

TEST(FindWay, TakesNoStepsToWhereItBegins) {
  EXPECT_THAT(Steps({Domain("a", {Into("b")}), Domain("b", {Into("a")})}, "a", "a"),
              Optional(IsEmpty()));
}

TEST(FindWay, TakesOtherRulesForNoTransitions) {
  const Rule access{.kind = RuleKind::kObjectAccess, .words = {"x", "b", "exec"}, .verdict = true};
  EXPECT_EQ(Steps({Domain("a", {access}), Domain("b")}, "a", "b"), std::nullopt);
}

}  // namespace
}  // namespace PolicyTest
