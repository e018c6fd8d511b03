// Reading what is installed: hunts for rules that get lost, change their order or their domain, and
// for reading more than was asked for.

#include "policy/installed_policy.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "domain/rule_families.h"
#include "support/message_of.h"

namespace PolicyTest {
namespace {

using Policy::InstalledDomain;
using Policy::Level;
using Policy::Rule;
using SecPolicyTest::ScriptedHost;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using testing::ElementsAre;

std::vector<std::string> TextsOf(const std::vector<Rule>& rules) {
  std::vector<std::string> texts;
  for (const Rule& rule : rules) texts.push_back(rule.Text());
  return texts;
}

std::vector<std::string> NamesOf(const std::vector<InstalledDomain>& domains) {
  std::vector<std::string> names;
  for (const InstalledDomain& domain : domains) names.push_back(domain.name);
  return names;
}

class InstalledPolicy : public testing::Test {
 protected:
  InstalledPolicy() {
    host.domains[4] = {.name = "appDom",
                       .level = "permissive",
                       .state = 8,
                       .refCount = 3,
                       .worldRefCount = 2,
                       .dflt = TeskCtl::Security::TESKACCESS_DEFAULT_DOM_CHECK_ACCESS};
    for (const auto& family : SecPolicyTest::AllFamilies()) family.install(host.rules[4]);
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
};

TEST_F(InstalledPolicy, DescribesADomain) {
  const auto domain = Policy::ReadDomain(access, 4);
  ASSERT_TRUE(domain.has_value());
  EXPECT_EQ(domain->name, "appDom");
  EXPECT_EQ(domain->id, 4U);
  EXPECT_EQ(domain->level, Level::kPermissive);
  EXPECT_EQ(domain->state, 8U);
  EXPECT_EQ(domain->references, 3U);
  EXPECT_EQ(domain->worldReferences, 2U);
  EXPECT_EQ(domain->defaultRules, TeskCtl::Security::TESKACCESS_DEFAULT_DOM_CHECK_ACCESS);
}

TEST_F(InstalledPolicy, HasTheRulesOfEveryKindInTheirOrder) {
  const auto domain = Policy::ReadDomain(access, 4);
  ASSERT_TRUE(domain.has_value());
  std::string keywords;
  for (const Rule& rule : domain->rules) keywords += FormOf(rule.kind).keyword;
  EXPECT_EQ(keywords, "-a-a-c-c-d-d-f-f-p-p-r-r-s-s-u-u");
}

TEST_F(InstalledPolicy, HasNoDomainInAnEmptySlot) {
  const auto run =
      SecPolicyTest::Record([&] { EXPECT_EQ(Policy::ReadDomain(access, 2), std::nullopt); });
  EXPECT_EQ(run.Text(), "GetCompleteDomainInfo(2)\nreturns\n");
}

TEST_F(InstalledPolicy, ReadsOneDomainAlone) {
  const auto run = SecPolicyTest::Record([&] { Policy::ReadDomain(access, 4); });
  EXPECT_EQ(run.Text(), SecPolicyTest::Lines({
                            "GetCompleteDomainInfo(4)",
                            "GetObjectAccessRules(4)",
                            "GetCapabilityRules(4)",
                            "GetDomTransRules(4)",
                            "GetFileCreationRules(4)",
                            "GetCapabilityParamRules(4)",
                            "GetFilePathAccessRules(4)",
                            "GetSyscallRules(4)",
                            "GetUnixSockCreationRules(4)",
                            "returns",
                        }));
}

TEST_F(InstalledPolicy, ListsDomainsWithoutTheirRules) {
  const std::vector<InstalledDomain> domains = Policy::ListDomains(access);
  EXPECT_THAT(NamesOf(domains), ElementsAre("hostDom", "appDom"));
  EXPECT_TRUE(domains[1].rules.empty());
}

TEST_F(InstalledPolicy, HasAllDomainsAndObjects) {
  host.keywords[TeskCtl::Security::TESKACCESS_KEYWORD_LABEL] = {{"a", 4}, {"b", 7}};
  const Policy::InstalledPolicy policy = Policy::ReadPolicy(access);
  EXPECT_THAT(NamesOf(policy.domains), ElementsAre("hostDom", "appDom"));
  EXPECT_TRUE(policy.domains[0].rules.empty());
  EXPECT_EQ(policy.domains[1].rules.size(), 16U);
  EXPECT_THAT(policy.objects, ElementsAre(testing::Pair("a", 4U), testing::Pair("b", 7U)));
}

TEST_F(InstalledPolicy, RefusesALevelThatIsNone) {
  host.domains[4].level = "lax";
  EXPECT_EQ(SecPolicyTest::MessageOf([&] { Policy::ReadDomain(access, 4); }),
            "unknown enforcement level 'lax' of domain 'appDom'");
}

TEST_F(InstalledPolicy, HasTheTransitionsIntoADomainOnce) {
  host.domains[5] = {.name = "otherDom"};
  host.rules[4].domTrans = {{1, 4, "appDom", "tool", "otherDom", 5, "exec", true},
                            {2, 4, "appDom", "tool", "appDom", 4, "exec", true},
                            {3, 4, "appDom", "trap", "otherDom", 5, "exec", false}};
  host.rules[5].domTrans = {{9, 5, "otherDom", "tool", "otherDom", 5, "exec", true},
                            {9, 5, "otherDom", "gate", "otherDom", 5, "enter", true}};
  EXPECT_THAT(TextsOf(Policy::ReadTransitionsInto("otherDom", access)),
              ElementsAre("-d gate otherDom enter grant", "-d tool otherDom exec grant"));
  EXPECT_THAT(TextsOf(Policy::ReadTransitionsInto("hostDom", access)), ElementsAre());
}

}  // namespace
}  // namespace PolicyTest
