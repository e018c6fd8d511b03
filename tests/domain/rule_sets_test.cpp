// What every kind of rule set does in the same way, shown on each.

#include "domain/rule_families.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyTest {
namespace {

using SecPolicy::PolicyRules;

std::string FamilyName(const testing::TestParamInfo<RuleFamily>& info) { return info.param.name; }

// A rule set of the family and the host that it works against.
class FamilyTest : public testing::TestWithParam<RuleFamily> {
 protected:
  FamilyTest() {
    rules->keyword = GetParam().keyword;
    EXPECT_EQ(host.DeclareDomain("targetDom"), 1u);
  }

  Transcript Add(const std::string& line, unsigned int number = 7) {
    return Record([&] { rules->AddRule(number, "appDom", 42, Words(line), access); });
  }
  // A good line that is expected to be taken.
  void AddGood(const char* line, unsigned int number = 7) {
    EXPECT_EQ(Add(line, number).exceptionText, "");
  }
  std::string Set() {
    return Record([&] { rules->Set(access); }).Text();
  }
  std::string Printed() {
    return Record([&] { rules->PrintRules(); }).Text();
  }
  void ExpectNoRules() {
    EXPECT_EQ(Printed(), "returns\n");
    EXPECT_EQ(Set(), "returns\n");
  }
  std::string Lookups() const { return Lookups(GetParam().lookups.size()); }
  // The first `count` questions that a good line asks of the host.
  std::string Lookups(std::size_t count) const {
    std::string text;
    for (std::size_t index = 0; index < count; ++index) {
      text += std::string(GetParam().lookups[index]) + "\n";
    }
    return text;
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  std::unique_ptr<PolicyRules> rules = GetParam().make();
};

// ---- All eight.

class RuleSet : public FamilyTest {};
INSTANTIATE_TEST_SUITE_P(Families, RuleSet, testing::ValuesIn(AllFamilies()), FamilyName);

TEST_P(RuleSet, StartsWithoutKeyword) { EXPECT_EQ(GetParam().make()->keyword, ""); }

TEST_P(RuleSet, TakesGoodLine) {
  EXPECT_EQ(Add(GetParam().granted).Text(), Lookups() + "returns\n");
  EXPECT_EQ(Add(GetParam().revoked).Text(), Lookups() + "returns\n");

  EXPECT_EQ(Printed(), Lines({GetParam().printedGranted, GetParam().printedRevoked,
                              R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

TEST_P(RuleSet, RefusesLineWithTooFewOrTooManyWords) {
  for (const char* line : GetParam().wrongLength) {
    EXPECT_EQ(Add(line).Text(),
              "throws SecPolicy::LineFailure: Error in parsing policy for domain: appDom: 7 : "
              "incorrect number of arguments for this rule type\n")
        << line;
  }
  ExpectNoRules();

  AddGood(GetParam().granted);
  EXPECT_EQ(Printed(),
            Lines({GetParam().printedGranted, R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

TEST_P(RuleSet, KeepsRulesBeforeRefusedLine) {
  AddGood(GetParam().granted);
  EXPECT_EQ(Add("", 4294967295).exceptionText,
            "Error in parsing policy for domain: appDom: 4294967295 : incorrect number of "
            "arguments for this rule type");

  EXPECT_EQ(Printed(),
            Lines({GetParam().printedGranted, R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

TEST_P(RuleSet, LeavesCallersWordsAlone) {
  std::queue<std::string> words = Words(GetParam().granted);
  rules->AddRule(7, "appDom", 42, words, access);
  EXPECT_EQ(words, Words(GetParam().granted));
}

TEST_P(RuleSet, KeepsSameLineTwice) {
  AddGood(GetParam().granted, 7);
  AddGood(GetParam().granted, 8);

  EXPECT_EQ(Printed(), Lines({GetParam().printedGranted, GetParam().printedGranted,
                              R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

TEST_P(RuleSet, PrintsNothingWithoutRules) {
  EXPECT_EQ(Printed(), "returns\n");
  EXPECT_EQ(host.StandardOutput(), "");
}

TEST_P(RuleSet, PrintsWithKeywordThatItWasGiven) {
  rules->keyword = "-?";
  AddGood(GetParam().granted);

  std::string printed = GetParam().printedGranted;
  printed.replace(printed.find(GetParam().keyword), 2, "-?");
  EXPECT_EQ(Printed(), Lines({printed, R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

TEST_P(RuleSet, SetsNothingWithoutRules) { EXPECT_EQ(Set(), "returns\n"); }

TEST_P(RuleSet, ReadsRulesFromKernel) {
  GetParam().install(host.rules[42]);

  EXPECT_EQ(Record([&] { rules->ReadSystemRules(42, access); }).Text(),
            Lines({std::string(GetParam().getter) + "(42)", "returns"}));
  EXPECT_EQ(Printed(), Lines({GetParam().printedGranted, GetParam().printedRevoked,
                              R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

TEST_P(RuleSet, ReadsRulesOfNoOtherDomain) {
  GetParam().install(host.rules[42]);

  EXPECT_EQ(Record([&] { rules->ReadSystemRules(43, access); }).Text(),
            Lines({std::string(GetParam().getter) + "(43)", "returns"}));
  EXPECT_EQ(Printed(), "returns\n");
}

TEST_P(RuleSet, PassesOnFailureToReadAsItIs) {
  const std::string getter = GetParam().getter;
  host.FailWith(getter, Nth(1), DerivedBraxoException("no rules"));
  host.FailForeign(getter, Nth(2));

  EXPECT_EQ(Record([&] { rules->ReadSystemRules(42, access); }).Text(),
            Lines({getter + "(42)", "throws SecPolicyTest::DerivedBraxoException: no rules"}));
  EXPECT_EQ(Record([&] { rules->ReadSystemRules(42, access); }).Text(),
            Lines({getter + "(42)", "throws SecPolicyTest::ForeignException: foreign"}));
  EXPECT_EQ(Record([&] { rules->ReadSystemRules(42, access); }).Text(),
            Lines({getter + "(42)", "returns"}));
}

// ---- All but the parameter checks.

class RuleSetWithoutConstraints : public FamilyTest {};
std::vector<RuleFamily> FamiliesWithoutConstraints() {
  std::vector<RuleFamily> families = AllFamilies();
  std::erase_if(families, [](const RuleFamily& family) { return family.keyword[1] == 'p'; });
  return families;
}
INSTANTIATE_TEST_SUITE_P(Families, RuleSetWithoutConstraints,
                         testing::ValuesIn(FamiliesWithoutConstraints()), FamilyName);

TEST_P(RuleSetWithoutConstraints, AsksNothingToCheckConstraints) {
  host.Fail("CheckCapabilityParamRuleConstraints", "conflict");
  AddGood(GetParam().granted);
  AddGood(GetParam().revoked);

  EXPECT_EQ(Record([&] { rules->CheckConstraints("appDom", access); }).Text(), "returns\n");
}

// ---- The seven whose lines end in a verdict.

class VerdictRuleSet : public FamilyTest {
 protected:
  // The good line without its last word.
  std::string WordsBeforeVerdict() const {
    const std::string line = GetParam().granted;
    return line.substr(0, line.rfind(' ') + 1);
  }
  // A transition looks its target up before it comes to the verdict.
  std::string LookupsBeforeVerdict() const {
    return GetParam().keyword == std::string("-d") ? Lookups(1) : "";
  }
  static std::string NameOf(const std::string& call) { return call.substr(0, call.find('(')); }
  // What `call` shows between the parentheses.
  static std::string ArgumentsOf(const std::string& call) {
    const std::size_t start = call.find('(') + 1;
    return call.substr(start, call.size() - start - 1);
  }
};
INSTANTIATE_TEST_SUITE_P(Families, VerdictRuleSet, testing::ValuesIn(VerdictFamilies()),
                         FamilyName);

TEST_P(VerdictRuleSet, RefusesVerdictThatIsNeitherGrantNorRevoke) {
  for (const std::string word : {"Grant", "allow", "deny", "REVOKE", "grants"}) {
    EXPECT_EQ(Add(WordsBeforeVerdict() + word).Text(),
              LookupsBeforeVerdict() +
                  "throws SecPolicy::LineFailure: Error in parsing policy for domain: appDom: "
                  "7 : invalid keyword " +
                  word + "\n");
  }
  ExpectNoRules();

  AddGood(GetParam().granted);
  EXPECT_EQ(Set(), Lines({GetParam().setGranted, "returns"}));
}

// Failed from the last lookup to the first, each fault is met before the ones already scripted: the
// words are checked in order.
TEST_P(VerdictRuleSet, RefusesWordThatKernelDoesNotKnow) {
  AddGood(GetParam().granted);

  for (std::size_t index = GetParam().lookups.size(); index-- > 0;) {
    const std::string lookup = GetParam().lookups[index];
    const std::string message = "unknown word " + std::to_string(index);
    host.FailWith(NameOf(lookup), With(ArgumentsOf(lookup)), DerivedBraxoException(message));

    EXPECT_EQ(Add(GetParam().granted).Text(),
              Lookups(index + 1) +
                  "throws SecPolicy::LineFailure: Error in parsing policy for domain: appDom: "
                  "7 : " +
                  message + "\n");
  }

  EXPECT_EQ(Set(), Lines({GetParam().setGranted, "returns"}));
}

TEST_P(VerdictRuleSet, PassesOnForeignExceptionOfLookup) {
  for (std::size_t index = GetParam().lookups.size(); index-- > 0;) {
    const std::string lookup = GetParam().lookups[index];
    host.FailForeign(NameOf(lookup), With(ArgumentsOf(lookup)));

    EXPECT_EQ(Add(GetParam().granted).Text(),
              Lookups(index + 1) + "throws SecPolicyTest::ForeignException: foreign\n");
  }
  ExpectNoRules();
}

TEST_P(VerdictRuleSet, IgnoresResultOfKeywordCheckThatDoesNotThrow) {
  host.ReturnFalse("ValidateKeyword");
  AddGood(GetParam().granted);
  EXPECT_EQ(Set(), Lines({GetParam().setGranted, "returns"}));
}

TEST_P(VerdictRuleSet, ReportsVerdictBeforeUnknownWord) {
  host.Fail("ValidateKeyword", "unknown word");

  EXPECT_EQ(Add(WordsBeforeVerdict() + "allow").exceptionText,
            "Error in parsing policy for domain: appDom: 7 : invalid keyword allow");
  EXPECT_EQ(Add(GetParam().granted).exceptionText,
            "Error in parsing policy for domain: appDom: 7 : unknown word");
}

TEST_P(VerdictRuleSet, SetsGrantAndRevokeOfSameThingInOrder) {
  AddGood(GetParam().granted, 7);
  AddGood(GetParam().revoked, 9);
  EXPECT_EQ(Set(), Lines({GetParam().setGranted, OnLine(GetParam().setRevoked, 9), "returns"}));
}

TEST_P(VerdictRuleSet, SetsSameLineTwice) {
  AddGood(GetParam().granted, 7);
  AddGood(GetParam().granted, 8);
  EXPECT_EQ(Set(), Lines({GetParam().setGranted, OnLine(GetParam().setGranted, 8), "returns"}));
}

TEST_P(VerdictRuleSet, KeepsRulesAfterSet) {
  AddGood(GetParam().granted);
  EXPECT_EQ(Set(), Lines({GetParam().setGranted, "returns"}));
  EXPECT_EQ(Set(), Lines({GetParam().setGranted, "returns"}));
}

TEST_P(VerdictRuleSet, StopsAtRefusedRuleAndNamesItsLine) {
  for (const unsigned int line : {10u, 20u, 30u, 40u, 50u}) AddGood(GetParam().granted, line);
  const std::string call = GetParam().setGranted;
  host.FailWith(NameOf(call), Nth(3), DerivedBraxoException("no room"));

  EXPECT_EQ(Set(),
            Lines({OnLine(call, 10), OnLine(call, 20), OnLine(call, 30),
                   "throws SecPolicy::LineFailure: Error in setting policy for domain: appDom: "
                   "30 : no room"}));
  EXPECT_EQ(Set(), Lines({OnLine(call, 10), OnLine(call, 20), OnLine(call, 30), OnLine(call, 40),
                          OnLine(call, 50), "returns"}));
}

TEST_P(VerdictRuleSet, PassesOnForeignExceptionOfSet) {
  for (const unsigned int line : {10u, 20u, 30u}) AddGood(GetParam().granted, line);
  const std::string call = GetParam().setGranted;
  host.FailForeign(NameOf(call), Nth(2));

  EXPECT_EQ(Set(), Lines({OnLine(call, 10), OnLine(call, 20),
                          "throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_P(VerdictRuleSet, SetsRulesReadFromKernelAsTheyWere) {
  GetParam().install(host.rules[42]);
  rules->ReadSystemRules(42, access);
  EXPECT_EQ(Set(), Lines({GetParam().setGranted, GetParam().setRevoked, "returns"}));
}

}  // namespace
}  // namespace SecPolicyTest
