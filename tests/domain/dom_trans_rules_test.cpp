// The target of a transition: looked up while the line is read, once, and reported in its place.

#include "secpolicy/domain/dom_trans_rules.h"

#include "domain/rule_families.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyTest {
namespace {

class DomTransRules : public testing::Test {
 protected:
  DomTransRules() {
    rules.keyword = "-d";
    targetId = host.DeclareDomain("targetDom");
  }

  Transcript Add(const std::string& line, unsigned int number = 4) {
    return Record([&] { rules.AddRule(number, "appDom", 42, Words(line), access); });
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  SecPolicy::DomTransRules rules;
  unsigned int targetId = 0;
};

TEST_F(DomTransRules, LooksTargetUpWhileParsing) {
  EXPECT_EQ(Add("toolLabel targetDom exec grant").Text(),
            Lines({R"(FindDomain("targetDom"))", R"(ValidateKeyword(LABEL, "toolLabel"))",
                   R"(ValidateKeyword(DOM_TRANS, "exec"))", "returns"}));
  EXPECT_EQ(rules.rules.front().targetDomainId, targetId);
}

TEST_F(DomTransRules, RefusesUnknownTarget) {
  EXPECT_EQ(Add("toolLabel otherDom exec grant").Text(),
            Lines({R"(FindDomain("otherDom"))",
                   "throws SecPolicy::LineFailure: Error in parsing policy for domain: appDom: "
                   "4 : Failed to fetch domain id for: otherDom"}));
  EXPECT_TRUE(rules.rules.empty());
}

TEST_F(DomTransRules, ReportsUnknownTargetBeforeBadVerdict) {
  EXPECT_EQ(Add("toolLabel otherDom exec allow").exceptionText,
            "Error in parsing policy for domain: appDom: 4 : Failed to fetch domain id for: "
            "otherDom");
  EXPECT_EQ(Add("toolLabel targetDom exec allow").exceptionText,
            "Error in parsing policy for domain: appDom: 4 : invalid keyword allow");
}

TEST_F(DomTransRules, CountsWordsBeforeLookingTargetUp) {
  EXPECT_EQ(Add("toolLabel otherDom exec extra grant").Text(),
            "throws SecPolicy::LineFailure: Error in parsing policy for domain: appDom: 4 : "
            "incorrect number of arguments for this rule type\n");
}

TEST_F(DomTransRules, NamesLineOfFailedLookup) {
  host.Fail("FindDomain", "table unreadable");
  EXPECT_EQ(Add("toolLabel targetDom exec grant").Text(),
            Lines({R"(FindDomain("targetDom"))",
                   "throws SecPolicy::LineFailure: Error in parsing policy for domain: appDom: "
                   "4 : table unreadable"}));
}

TEST_F(DomTransRules, DoesNotLookTargetUpAgainWhenSet) {
  Add("toolLabel targetDom exec grant");
  host.hiddenDomains.insert("targetDom");

  EXPECT_EQ(
      Record([&] { rules.Set(access); }).Text(),
      Lines(
          {R"(SetDomTransRule({line: 4, domainId: 42, domainName: "appDom", label: "toolLabel", targetDomain: "targetDom", targetDomainId: 1, transitionKind: "exec", grant: true}))",
           "returns"}));
}

TEST_F(DomTransRules, PrintsNameOfTargetReadBack) {
  host.rules[42].domTrans = {{0, 42, "appDom", "toolLabel", "targetDom", 77, "enter", false}};
  rules.ReadSystemRules(42, access);

  EXPECT_EQ(Record([&] { rules.PrintRules(); }).Text(),
            Lines({R"(stdout "-d toolLabel targetDom enter revoke\n")", R"(stdout "\n")",
                   R"(stdout "\n")", "returns"}));
}

}  // namespace
}  // namespace SecPolicyTest
