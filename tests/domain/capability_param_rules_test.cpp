// Parameter checks of one or two parameters, and conflicts between them: who is asked, when, and
// how a refusal is told.

#include "secpolicy/domain/capability_param_rules.h"

#include "domain/rule_families.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyTest {
namespace {

class CapabilityParamRules : public testing::Test {
 protected:
  CapabilityParamRules() { rules.keyword = "-p"; }

  Transcript Add(const std::string& line, unsigned int number = 7) {
    return Record([&] { rules.AddRule(number, "appDom", 42, Words(line), access); });
  }
  std::string Check() {
    return Record([&] { rules.CheckConstraints("appDom", access); }).Text();
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  SecPolicy::CapabilityParamRules rules;
};

TEST_F(CapabilityParamRules, LeavesSecondParameterEmptyInThreeWords) {
  EXPECT_EQ(Add("set_uid 0 revoke").Text(),
            Lines({R"(ValidateKeyword(PARAM_CHECK, "set_uid"))", "returns"}));

  EXPECT_EQ(
      Record([&] { rules.Set(access); }).Text(),
      Lines(
          {R"(SetCapabilityParamRule({line: 7, domainId: 42, domainName: "appDom", paramCheck: "set_uid", firstParam: "0", secondParam: "", grant: false}))",
           "returns"}));
  EXPECT_EQ(
      Record([&] { rules.PrintRules(); }).Text(),
      Lines({R"(stdout "-p set_uid 0 revoke\n")", R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

TEST_F(CapabilityParamRules, KeepsThirdOfFourWordsAsSecondParameter) {
  EXPECT_EQ(Add("bind_port 0x50 443 grant").Text(),
            Lines({R"(ValidateKeyword(PARAM_CHECK, "bind_port"))", "returns"}));

  ASSERT_EQ(rules.rules.size(), 1u);
  EXPECT_EQ(rules.rules.front().paramCheck, "bind_port");
  EXPECT_EQ(rules.rules.front().firstParam, "0x50");
  EXPECT_EQ(rules.rules.front().secondParam, "443");
  EXPECT_TRUE(rules.rules.front().grant);
  EXPECT_EQ(Record([&] { rules.PrintRules(); }).Text(),
            Lines({R"(stdout "-p bind_port 0x50 443 grant\n")", R"(stdout "\n")", R"(stdout "\n")",
                   "returns"}));
}

TEST_F(CapabilityParamRules, TakesAnyParameters) {
  EXPECT_EQ(Add("bind_port grant revoke grant").exceptionText, "");
  EXPECT_EQ(rules.rules.front().firstParam, "grant");
  EXPECT_EQ(rules.rules.front().secondParam, "revoke");
}

TEST_F(CapabilityParamRules, RefusesBadVerdictInThreeWords) {
  EXPECT_EQ(Add("bind_port 80 443").Text(),
            "throws SecPolicy::LineFailure: Error in parsing policy for domain: appDom: 7 : "
            "invalid keyword 443\n");
  EXPECT_TRUE(rules.rules.empty());
}

TEST_F(CapabilityParamRules, ChecksConstraintsOfAllRulesAtOnce) {
  Add("bind_port 80 90 grant", 3);
  Add("bind_port 85 revoke", 4);

  EXPECT_EQ(
      Check(),
      Lines(
          {R"(CheckCapabilityParamRuleConstraints("appDom", [{line: 3, domainId: 42, domainName: "appDom", paramCheck: "bind_port", firstParam: "80", secondParam: "90", grant: true}, {line: 4, domainId: 42, domainName: "appDom", paramCheck: "bind_port", firstParam: "85", secondParam: "", grant: false}]))",
           "returns"}));
}

TEST_F(CapabilityParamRules, ChecksConstraintsWithoutRules) {
  EXPECT_EQ(Check(), Lines({R"(CheckCapabilityParamRuleConstraints("appDom", []))", "returns"}));
}

TEST_F(CapabilityParamRules, NamesDomainOfConflict) {
  host.Fail("CheckCapabilityParamRuleConstraints", "80 granted and revoked");
  EXPECT_EQ(Check(), Lines({R"(CheckCapabilityParamRuleConstraints("appDom", []))",
                            "throws Braxo::Lib::BraxoException: Policy constraint error for "
                            "domain: appDom : 80 granted and revoked"}));
}

TEST_F(CapabilityParamRules, ReportsConflictByExceptionOfItsOwn) {
  host.FailWith("CheckCapabilityParamRuleConstraints", Every(), DerivedBraxoException("conflict"));
  EXPECT_EQ(Check(), Lines({R"(CheckCapabilityParamRuleConstraints("appDom", []))",
                            "throws Braxo::Lib::BraxoException: Policy constraint error for "
                            "domain: appDom : conflict"}));
}

TEST_F(CapabilityParamRules, PassesOnForeignExceptionOfConstraintCheck) {
  host.FailForeign("CheckCapabilityParamRuleConstraints");
  EXPECT_EQ(Check(), Lines({R"(CheckCapabilityParamRuleConstraints("appDom", []))",
                            "throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_F(CapabilityParamRules, IgnoresResultOfConstraintCheck) {
  host.ReturnFalse("CheckCapabilityParamRuleConstraints");
  EXPECT_EQ(Check(), Lines({R"(CheckCapabilityParamRuleConstraints("appDom", []))", "returns"}));
}

}  // namespace
}  // namespace SecPolicyTest
