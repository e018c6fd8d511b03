// The template domain for checking access: made only when the option says so, once, with its one
// rule; the option is freed whatever fails.

#include "secpolicy/domain/check_access_domain.h"

#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

constexpr char kOption[] = "/UserVars/CheckAccessTemplateEnabled";

constexpr char kFindOption[] = R"(FindOption("/UserVars/CheckAccessTemplateEnabled"))";
constexpr char kGetValue[] =
    R"(AdvancedIntegerOption::GetValue("/UserVars/CheckAccessTemplateEnabled"))";
constexpr char kDeleteOption[] = R"(~AdvancedOption("/UserVars/CheckAccessTemplateEnabled"))";
constexpr char kFindDomain[] = R"(FindDomain("checkAccessTemplateDom"))";
constexpr char kCreateDomain[] = R"(CreateDomain("checkAccessTemplateDom", 3))";
constexpr char kSetRule[] =
    R"(SetFilePathAccessRules([{line: 0, domainId: 1, domainName: "", path: "/", permissions: ""}]))";

class CreateCheckAccessPolicyDomain : public testing::Test {
 protected:
  std::string Create() {
    return Record([&] { SecPolicy::CreateCheckAccessPolicyDomain(access); }).Text();
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
};

TEST_F(CreateCheckAccessPolicyDomain, DoesNothingWithoutOption) {
  EXPECT_EQ(Create(), Lines({kFindOption, "returns"}));
}

TEST_F(CreateCheckAccessPolicyDomain, DoesNothingForOptionOfOtherKind) {
  host.SetNonIntegerOption(kOption);
  EXPECT_EQ(Create(), Lines({kFindOption, kDeleteOption, "returns"}));
}

TEST_F(CreateCheckAccessPolicyDomain, DoesNothingForValueZero) {
  host.SetOption(kOption, 0);
  EXPECT_EQ(Create(), Lines({kFindOption, kGetValue, kDeleteOption, "returns"}));
}

TEST_F(CreateCheckAccessPolicyDomain, CreatesDomainWithOneRuleForWholeTree) {
  host.SetOption(kOption, 1);
  EXPECT_EQ(Create(), Lines({kFindOption, kGetValue, kFindDomain, kCreateDomain, kFindDomain,
                             kSetRule, kDeleteOption, "returns"}));
}

TEST_F(CreateCheckAccessPolicyDomain, TakesAnyValueButZeroForYes) {
  for (const long value : {2L, -1L, 4294967296L}) {
    host.domains.erase(1);
    host.SetOption(kOption, value);
    EXPECT_EQ(Create(), Lines({kFindOption, kGetValue, kFindDomain, kCreateDomain, kFindDomain,
                               kSetRule, kDeleteOption, "returns"}))
        << value;
  }
}

TEST_F(CreateCheckAccessPolicyDomain, LeavesExistingDomainAsItIs) {
  host.SetOption(kOption, 1);
  host.DeclareDomain("checkAccessTemplateDom");
  EXPECT_EQ(Create(), Lines({kFindOption, kGetValue, kFindDomain, kDeleteOption, "returns"}));
}

TEST_F(CreateCheckAccessPolicyDomain, SetsNoRuleWhenCreatedDomainIsNotFound) {
  host.SetOption(kOption, 1);
  host.hiddenDomains.insert("checkAccessTemplateDom");
  EXPECT_EQ(Create(), Lines({kFindOption, kGetValue, kFindDomain, kCreateDomain, kFindDomain,
                             kDeleteOption, "returns"}));
}

// The rule names the identifier that the second look-up found.
TEST_F(CreateCheckAccessPolicyDomain, NamesIdentifierOfCreatedDomainInRule) {
  host.SetOption(kOption, 1);
  for (const char* name : {"one", "two", "three"}) host.DeclareDomain(name);
  EXPECT_EQ(
      Create(),
      Lines(
          {kFindOption, kGetValue, kFindDomain, kCreateDomain, kFindDomain,
           R"(SetFilePathAccessRules([{line: 0, domainId: 4, domainName: "", path: "/", permissions: ""}]))",
           kDeleteOption, "returns"}));
}

struct Step {
  const char* call;
  unsigned int nth;
  std::vector<std::string> before;  // and with the call that fails
  bool optionExists;
};
void PrintTo(const Step& step, std::ostream* stream) { *stream << step.call << step.nth; }

class CreateCheckAccessPolicyDomainFailure : public CreateCheckAccessPolicyDomain,
                                             public testing::WithParamInterface<Step> {
 protected:
  void ExpectLeaves(const std::string& exceptionType, const std::string& text) {
    host.SetOption(kOption, 1);
    const Transcript run = Record([&] { SecPolicy::CreateCheckAccessPolicyDomain(access); });

    std::vector<std::string> expected = GetParam().before;
    if (GetParam().optionExists) expected.push_back(kDeleteOption);
    EXPECT_EQ(run.trace, expected);
    EXPECT_EQ(run.exceptionType, exceptionType);
    EXPECT_EQ(run.exceptionText, text);
  }
};

INSTANTIATE_TEST_SUITE_P(
    Steps, CreateCheckAccessPolicyDomainFailure,
    testing::Values(
        Step{"FindOption", 1, {kFindOption}, false},
        Step{"AdvancedIntegerOption::GetValue", 1, {kFindOption, kGetValue}, true},
        Step{"FindDomain", 1, {kFindOption, kGetValue, kFindDomain}, true},
        Step{"CreateDomain", 1, {kFindOption, kGetValue, kFindDomain, kCreateDomain}, true},
        Step{"FindDomain",
             2,
             {kFindOption, kGetValue, kFindDomain, kCreateDomain, kFindDomain},
             true},
        Step{"SetFilePathAccessRules",
             1,
             {kFindOption, kGetValue, kFindDomain, kCreateDomain, kFindDomain, kSetRule},
             true}));

TEST_P(CreateCheckAccessPolicyDomainFailure, LeavesAsItIsAndDeletesOption) {
  host.FailWith(GetParam().call, Nth(GetParam().nth), DerivedBraxoException("refused"));
  ExpectLeaves("SecPolicyTest::DerivedBraxoException", "refused");
}

TEST_P(CreateCheckAccessPolicyDomainFailure, OfForeignTypeLeavesAsItIsAndDeletesOption) {
  host.FailForeign(GetParam().call, Nth(GetParam().nth));
  ExpectLeaves("SecPolicyTest::ForeignException", "foreign");
}

}  // namespace
}  // namespace SecPolicyTest
