// The one rule of a tardisk's policy: how it is read, refused and set, and what a bad file keeps
// from the others.

#include <gtest/gtest.h>

#include <cerrno>
#include <list>
#include <map>
#include <queue>
#include <string>
#include <type_traits>

#include "labels/expected_reports.h"
#include "secpolicy/secpolicy.h"
#include "secpolicy/tardisk/tardisk_exception_rules.h"
#include "secpolicy/tardisk/tardisk_rules.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"
#include "support/slot.h"

namespace SecPolicyTest {
namespace {

using SecPolicy::TardiskExceptionRules;
using SecPolicy::TardiskPolicy;
using SecPolicy::TardiskRules;
using SecPolicy::TeskAccess_TardiskExceptionRule;

std::queue<std::string> Tokens(std::initializer_list<std::string> tokens) {
  return std::queue<std::string>(std::deque<std::string>(tokens));
}

std::string BackingAsked(const std::string& path) {
  return "Sysinfo(1)\nSysinfo::AddInstancePath(" + Quoted(path) +
         ")\nSysinfo::Get(548)\n~Sysinfo()";
}

std::string FoundDomain(const std::string& name) { return "FindDomain(" + Quoted(name) + ")"; }

// The host calls that give the tardisk at `path` the label `label`.
std::string Labelled(const std::string& path, const std::string& label, unsigned int id) {
  return "LookupLabel(" + Quoted(label) + ", OBJECT)\nSetXattr(" + Quoted(path) +
         ", \"zorvan.security\", " + std::to_string(id) + ", 4, 2)";
}

// ---- The shape of the classes.

TEST(TardiskRulesShape, IsAbstractWithOneField) {
  EXPECT_TRUE(std::is_abstract_v<TardiskRules>);
  EXPECT_TRUE(std::has_virtual_destructor_v<TardiskRules>);
  EXPECT_EQ(sizeof(TardiskRules), sizeof(void*) + sizeof(std::string));
}

// The slot of whatever comes behind all operations tells how many there are: two are the
// destructor's.
struct OneMoreOperation : TardiskRules {
  virtual void Next() {}
};

TEST(TardiskRulesShape, OrdersTwoOperationsAndHasNoOther) {
  EXPECT_EQ(Slot(&TardiskRules::AddRule), 0);
  EXPECT_EQ(Slot(&TardiskRules::Set), 1);
  EXPECT_EQ(Slot(&OneMoreOperation::Next), 4);
}

TEST(TardiskExceptionRulesShape, IsAListWithAVirtualBase) {
  // A virtual base cannot be turned back statically.
  const auto canTurnBack = []<class Base>(Base* base) {
    return requires { static_cast<TardiskExceptionRules*>(base); };
  };
  EXPECT_FALSE(canTurnBack(static_cast<TardiskRules*>(nullptr)));
  EXPECT_TRUE(canTurnBack(static_cast<TardiskExceptionRules*>(nullptr)));
  EXPECT_TRUE((std::is_base_of_v<TardiskRules, TardiskExceptionRules>));
  EXPECT_EQ(
      sizeof(TardiskExceptionRules),
      sizeof(void*) + sizeof(std::list<TeskAccess_TardiskExceptionRule>) + sizeof(TardiskRules));
}

TEST(TardiskPolicyShape, IsAPathAndAMapWithoutVirtualFunctions) {
  EXPECT_FALSE(std::is_polymorphic_v<TardiskPolicy>);
  EXPECT_EQ(sizeof(TardiskPolicy),
            sizeof(std::string) + sizeof(std::map<std::string, TardiskRules*>));
}

TEST(TardiskPolicyShape, DoesNotTouchTheFile) {
  ScriptedHost host;
  EXPECT_EQ(Record([] { const TardiskPolicy policy("/no/such/file"); }).Text(), Lines({"returns"}));
}

// ---- One set of rules.

class TardiskExceptionRulesTest : public testing::Test {
 protected:
  TardiskExceptionRulesTest() {
    host.domains[7].name = "toolDom";
    host.domains[8].name = "daemonFrameworkDom";
    host.DeclareLabel("toolLabel", 42);
  }

  Transcript Add(const std::queue<std::string>& tokens) {
    return Record([&] { rules.AddRule(3, "/tardisks/tool.tgz", "/p/tool", tokens, access); });
  }
  Transcript Set() {
    return Record([&] { rules.Set(access); });
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  TardiskExceptionRules rules;
};

using TardiskExceptionRulesAddRule = TardiskExceptionRulesTest;
using TardiskExceptionRulesSet = TardiskExceptionRulesTest;

TEST_F(TardiskExceptionRulesAddRule, KeepsTheRuleWithTheDomainsIdentifier) {
  EXPECT_EQ(Add(Tokens({"toolLabel", "toolDom"})).Text(),
            Lines({FoundDomain("toolDom"), "returns"}));
  ASSERT_EQ(rules.rules.size(), 1U);
  const auto& [lineNumber, tardiskPath, label, domainName, domainId, policyFile] =
      rules.rules.front();
  EXPECT_EQ(lineNumber, 3U);
  EXPECT_EQ(tardiskPath, "/tardisks/tool.tgz");
  EXPECT_EQ(label, "toolLabel");
  EXPECT_EQ(domainName, "toolDom");
  EXPECT_EQ(domainId, 7U);
  EXPECT_EQ(policyFile, "/p/tool");
}

TEST_F(TardiskExceptionRulesAddRule, RefusesASecondRuleWithoutSayingWhere) {
  Add(Tokens({"toolLabel", "toolDom"}));
  EXPECT_EQ(Add(Tokens({"otherLabel", "toolDom"})).Text(),
            Lines({"throws SecPolicy::LineFailure: Only one rule of this type is allowed"}));
  ASSERT_EQ(rules.rules.size(), 1U);
  EXPECT_EQ(rules.rules.front().label, "toolLabel");
}

TEST_F(TardiskExceptionRulesAddRule, RefusesASecondRuleBeforeItCountsTheWords) {
  Add(Tokens({"toolLabel", "toolDom"}));
  EXPECT_EQ(Add(Tokens({"otherLabel"})).Text(),
            Lines({"throws SecPolicy::LineFailure: Only one rule of this type is allowed"}));
}

TEST_F(TardiskExceptionRulesAddRule, NeedsExactlyTwoWords) {
  for (const auto& tokens :
       {Tokens({}), Tokens({"toolLabel"}), Tokens({"toolLabel", "toolDom", "grant"})}) {
    EXPECT_EQ(Add(tokens).Text(),
              Lines({"throws SecPolicy::LineFailure: Error in parsing policy for domain: "
                     "/p/tool: 3 : incorrect number of arguments for this rule type"}));
  }
  EXPECT_TRUE(rules.rules.empty());
}

TEST_F(TardiskExceptionRulesAddRule, RefusesADomainThatIsNotThere) {
  host.hiddenDomains = {"toolDom"};
  EXPECT_EQ(Add(Tokens({"toolLabel", "toolDom"})).Text(),
            Lines({
                FoundDomain("toolDom"),
                "throws SecPolicy::LineFailure: Error in parsing policy for domain: /p/tool: 3 "
                ": Failed to fetch domain id for toolDom",
            }));
  EXPECT_TRUE(rules.rules.empty());
}

TEST_F(TardiskExceptionRulesAddRule, WrapsAFailingLookup) {
  host.FailWith("FindDomain", Every(), DerivedBraxoException("no table"));
  EXPECT_EQ(Add(Tokens({"toolLabel", "toolDom"})).Text(),
            Lines({
                FoundDomain("toolDom"),
                "throws SecPolicy::LineFailure: Error in parsing policy for domain: /p/tool: 3 "
                ": no table",
            }));
}

TEST_F(TardiskExceptionRulesAddRule, PassesForeignExceptions) {
  host.FailForeign("FindDomain");
  EXPECT_EQ(Add(Tokens({"toolLabel", "toolDom"})).Text(),
            Lines({FoundDomain("toolDom"), "throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_F(TardiskExceptionRulesSet, DoesNothingWithoutARule) {
  EXPECT_EQ(Set().Text(), Lines({"returns"}));
}

TEST_F(TardiskExceptionRulesSet, LabelsTheTardiskThenInstallsATransitionFromEveryLaunchDomain) {
  Add(Tokens({"toolLabel", "toolDom"}));
  EXPECT_EQ(
      Set().Text(),
      Lines({
          Labelled("/tardisks/tool.tgz", "toolLabel", 42),
          "GetTardiskLaunchDomains()",
          "GetTardiskExecEventKeyword()",
          FoundDomain("hostDom"),
          R"(SetDomTransRule({line: 3, domainId: 0, domainName: "hostDom", label: "toolLabel", )"
          R"(targetDomain: "toolDom", targetDomainId: 7, transitionKind: "tardisk_exec", )"
          R"(grant: true}))",
          "GetTardiskExecEventKeyword()",
          FoundDomain("daemonFrameworkDom"),
          R"(SetDomTransRule({line: 3, domainId: 8, domainName: "daemonFrameworkDom", )"
          R"(label: "toolLabel", targetDomain: "toolDom", targetDomainId: 7, )"
          R"(transitionKind: "tardisk_exec", grant: true}))",
          "returns",
      }));
}

TEST_F(TardiskExceptionRulesSet, TakesTheEventKeywordAsTheHostGivesIt) {
  host.tardiskExecEventKeyword = "launch";
  host.tardiskLaunchDomains = {"hostDom"};
  Add(Tokens({"toolLabel", "toolDom"}));
  EXPECT_EQ(Set().exceptionType, "");
  ASSERT_EQ(host.rules[0].domTrans.size(), 1U);
  EXPECT_EQ(host.rules[0].domTrans.front().transitionKind, "launch");
}

TEST_F(TardiskExceptionRulesSet, InstallsNoTransitionOfADomainIntoItself) {
  host.tardiskLaunchDomains = {"toolDom", "hostDom"};
  Add(Tokens({"toolLabel", "toolDom"}));
  EXPECT_EQ(
      Set().Text(),
      Lines({
          Labelled("/tardisks/tool.tgz", "toolLabel", 42),
          "GetTardiskLaunchDomains()",
          "GetTardiskExecEventKeyword()",
          FoundDomain("toolDom"),
          "GetTardiskExecEventKeyword()",
          FoundDomain("hostDom"),
          R"(SetDomTransRule({line: 3, domainId: 0, domainName: "hostDom", label: "toolLabel", )"
          R"(targetDomain: "toolDom", targetDomainId: 7, transitionKind: "tardisk_exec", )"
          R"(grant: true}))",
          "returns",
      }));
}

TEST_F(TardiskExceptionRulesSet, ComparesIdentifiersNotNames) {
  host.tardiskLaunchDomains = {"daemonFrameworkDom"};
  Add(Tokens({"toolLabel", "toolDom"}));
  host.domains[9].name = "toolDom2";
  host.domains.erase(7);
  host.domains[7].name = "daemonFrameworkDom";
  EXPECT_EQ(Set().Text(), Lines({
                              Labelled("/tardisks/tool.tgz", "toolLabel", 42),
                              "GetTardiskLaunchDomains()",
                              "GetTardiskExecEventKeyword()",
                              FoundDomain("daemonFrameworkDom"),
                              "returns",
                          }));
}

TEST_F(TardiskExceptionRulesSet, InstallsNoTransitionForUnlabeledTardisks) {
  Add(Tokens({"unlabeled", "toolDom"}));
  EXPECT_EQ(Set().Text(), Lines({Labelled("/tardisks/tool.tgz", "unlabeled", 2), "returns"}));
}

TEST_F(TardiskExceptionRulesSet, TakesOnlyTheExactWordForUnlabeled) {
  host.tardiskLaunchDomains = {"hostDom"};
  Add(Tokens({"Unlabeled", "toolDom"}));
  EXPECT_EQ(Set().exceptionType, "");
  EXPECT_EQ(host.rules[0].domTrans.size(), 1U);
}

TEST_F(TardiskExceptionRulesSet, WrapsAnUnknownLabelAndInstallsNothing) {
  host.DeclareLabel("toolLabel", 1);
  Add(Tokens({"toolLabel", "toolDom"}));
  EXPECT_EQ(Set().Text(),
            Lines({
                R"(LookupLabel("toolLabel", OBJECT))",
                "throws SecPolicy::LineFailure: /p/tool:3 : Tardisk: /tardisks/tool.tgz : "
                "Invalid label (toolLabel) for file /tardisks/tool.tgz",
            }));
}

TEST_F(TardiskExceptionRulesSet, WrapsALabelThatCannotBeWritten) {
  host.FailErrno("SetXattr", "/tardisks/tool.tgz", ENOENT);
  Add(Tokens({"toolLabel", "toolDom"}));
  EXPECT_EQ(Set().Text(),
            Lines({
                Labelled("/tardisks/tool.tgz", "toolLabel", 42),
                "throws SecPolicy::LineFailure: /p/tool:3 : Tardisk: /tardisks/tool.tgz : "
                "Unable to set file label (toolLabel) for file /tardisks/tool.tgz: No such file or "
                "directory",
            }));
}

TEST_F(TardiskExceptionRulesSet, WrapsAMissingLaunchDomain) {
  host.tardiskLaunchDomains = {"hostdDom", "hostDom"};
  Add(Tokens({"toolLabel", "toolDom"}));
  EXPECT_EQ(Set().Text(),
            Lines({
                Labelled("/tardisks/tool.tgz", "toolLabel", 42),
                "GetTardiskLaunchDomains()",
                "GetTardiskExecEventKeyword()",
                FoundDomain("hostdDom"),
                "throws SecPolicy::LineFailure: /p/tool:3 : Tardisk: /tardisks/tool.tgz : "
                "Failed to fetch domain id for hostdDom",
            }));
}

TEST_F(TardiskExceptionRulesSet, StopsAtTheFirstTransitionThatIsRefused) {
  host.Fail("SetDomTransRule", Nth(1), "table full");
  Add(Tokens({"toolLabel", "toolDom"}));
  EXPECT_EQ(
      Set().Text(),
      Lines({
          Labelled("/tardisks/tool.tgz", "toolLabel", 42),
          "GetTardiskLaunchDomains()",
          "GetTardiskExecEventKeyword()",
          FoundDomain("hostDom"),
          R"(SetDomTransRule({line: 3, domainId: 0, domainName: "hostDom", label: "toolLabel", )"
          R"(targetDomain: "toolDom", targetDomainId: 7, transitionKind: "tardisk_exec", )"
          R"(grant: true}))",
          "throws SecPolicy::LineFailure: /p/tool:3 : Tardisk: /tardisks/tool.tgz : "
          "table full",
      }));
}

// Every host call that applying a rule makes.
class TardiskExceptionRulesHostCall : public TardiskExceptionRulesTest,
                                      public testing::WithParamInterface<const char*> {
 protected:
  TardiskExceptionRulesHostCall() { Add(Tokens({"toolLabel", "toolDom"})); }
};

TEST_P(TardiskExceptionRulesHostCall, IsWrappedWhenItFails) {
  EXPECT_EQ(Set().exceptionType, "");
  host.FailWith(GetParam(), Every(), DerivedBraxoException("refused"));
  const Transcript run = Set();
  EXPECT_TRUE(run.trace.back().starts_with(GetParam())) << run.Text();
  EXPECT_EQ(run.exceptionType, "SecPolicy::LineFailure");
  EXPECT_EQ(run.exceptionText, "/p/tool:3 : Tardisk: /tardisks/tool.tgz : refused");
}

TEST_P(TardiskExceptionRulesHostCall, PassesForeignExceptions) {
  host.FailForeign(GetParam());
  const Transcript run = Set();
  EXPECT_TRUE(run.trace.back().starts_with(GetParam())) << run.Text();
  EXPECT_EQ(run.exceptionType, "SecPolicyTest::ForeignException");
  EXPECT_EQ(run.exceptionText, "foreign");
}

INSTANTIATE_TEST_SUITE_P(All, TardiskExceptionRulesHostCall,
                         testing::Values("LookupLabel", "GetTardiskLaunchDomains",
                                         "GetTardiskExecEventKeyword", "FindDomain",
                                         "SetDomTransRule"),
                         [](const auto& call) { return std::string(call.param); });

// The set is filled by hand: a policy file cannot hold more than one rule.
TEST_F(TardiskExceptionRulesSet, WritesAllLabelsBeforeAnyTransition) {
  host.DeclareLabel("otherLabel", 43);
  host.tardiskLaunchDomains = {"hostDom"};
  rules.rules = {{1, "/tardisks/tool.tgz", "toolLabel", "toolDom", 7, "/p/tool"},
                 {2, "/tardisks/plain.tgz", "unlabeled", "toolDom", 7, "/p/plain"},
                 {4, "/tardisks/other.tgz", "otherLabel", "hostDom", 0, "/p/other"}};
  EXPECT_EQ(
      Set().Text(),
      Lines({
          Labelled("/tardisks/tool.tgz", "toolLabel", 42),
          Labelled("/tardisks/plain.tgz", "unlabeled", 2),
          Labelled("/tardisks/other.tgz", "otherLabel", 43),
          "GetTardiskLaunchDomains()",
          "GetTardiskExecEventKeyword()",
          FoundDomain("hostDom"),
          R"(SetDomTransRule({line: 1, domainId: 0, domainName: "hostDom", label: "toolLabel", )"
          R"(targetDomain: "toolDom", targetDomainId: 7, transitionKind: "tardisk_exec", )"
          R"(grant: true}))",
          "GetTardiskLaunchDomains()",
          "GetTardiskExecEventKeyword()",
          FoundDomain("hostDom"),
          "returns",
      }));
}

TEST_F(TardiskExceptionRulesSet, NamesTheFailingRule) {
  host.FailErrno("SetXattr", "/tardisks/other.tgz", EROFS);
  rules.rules = {{1, "/tardisks/tool.tgz", "toolLabel", "toolDom", 7, "/p/tool"},
                 {4, "/tardisks/other.tgz", "toolLabel", "toolDom", 7, "/p/other"}};
  EXPECT_EQ(Set().Text(),
            Lines({
                Labelled("/tardisks/tool.tgz", "toolLabel", 42),
                Labelled("/tardisks/other.tgz", "toolLabel", 42),
                "throws SecPolicy::LineFailure: /p/other:4 : Tardisk: /tardisks/other.tgz : "
                "Unable to set file label (toolLabel) for file /tardisks/other.tgz: Read-only file "
                "system",
            }));
}

// ---- A policy file.

class TardiskPolicyTest : public testing::Test {
 protected:
  TardiskPolicyTest() {
    host.domains[7].name = "toolDom";
    host.DeclareLabel("toolLabel", 42);
    host.DeclareLabel("baseLabel", 43);
    host.tardiskLaunchDomains = {"hostDom"};
  }
  ~TardiskPolicyTest() override {
    for (const TardiskPolicy* policy : policies) delete policy;
  }

  // The policy of the file `name`, which the tardisk `name`.tgz brought.
  TardiskPolicy& Policy(const std::string& name, const std::string& text) {
    tree.Write(name, text);
    host.SetTardisk(tree / name, name + ".tgz");
    policies.push_back(new TardiskPolicy(tree / name));
    return *policies.back();
  }
  Transcript Parse(TardiskPolicy& policy) {
    return Record([&] { policy.ParsePolicy(access); });
  }
  Transcript Set(TardiskPolicy& policy) {
    return Record([&] { policy.SetPolicy(access); });
  }
  Transcript ParseAndSet() {
    return Record([&] { SecPolicy::ParseAndSetTardiskPolicy(policies, access); });
  }

  // The host calls that apply "-E LABEL toolDom" of `line`.
  static std::string Applied(const std::string& tardisk, const std::string& label, unsigned int id,
                             unsigned int line) {
    return Labelled("/tardisks/" + tardisk + ".tgz", label, id) +
           "\nGetTardiskLaunchDomains()\nGetTardiskExecEventKeyword()\nFindDomain(\"hostDom\")\n"
           "SetDomTransRule({line: " +
           std::to_string(line) +
           ", domainId: 0, domainName: \"hostDom\", label: " + Quoted(label) +
           ", targetDomain: \"toolDom\", targetDomainId: 7, transitionKind: \"tardisk_exec\", "
           "grant: true})";
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  PolicyTree tree;
  std::list<TardiskPolicy*> policies;
};

using TardiskPolicyParsePolicy = TardiskPolicyTest;
using TardiskPolicySetPolicy = TardiskPolicyTest;
using ParseAndSetTardiskPolicy = TardiskPolicyTest;

TEST_F(TardiskPolicyParsePolicy, KeepsTheRuleWithItsLineAndTardisk) {
  TardiskPolicy& policy = Policy("tool", "# the tool\n\n  -E toolLabel toolDom # all of it\n");
  EXPECT_EQ(Parse(policy).Text(),
            Lines({BackingAsked(tree / "tool"), FoundDomain("toolDom"), "returns"}));
  EXPECT_EQ(Set(policy).Text(), Lines({Applied("tool", "toolLabel", 42, 3), "returns"}));
}

TEST_F(TardiskPolicyParsePolicy, TakesNothingFromAFileWithoutWords) {
  TardiskPolicy& policy = Policy("tool", "# nothing\n\n   \n");
  EXPECT_EQ(Parse(policy).Text(), Lines({BackingAsked(tree / "tool"), "returns"}));
  EXPECT_EQ(Set(policy).Text(), Lines({"returns"}));
}

TEST_F(TardiskPolicyParsePolicy, ReportsAFileFromNoTardiskAndReadsNothing) {
  TardiskPolicy& policy = Policy("tool", "-X\n");
  host.SetTardisk(tree / "tool", "");
  EXPECT_EQ(Parse(policy).Text(),
            Lines({
                BackingAsked(tree / "tool"),
                ReportedError("No backing tardisk for policy file " + tree / "tool"),
                "returns",
            }));
  EXPECT_EQ(Set(policy).Text(), Lines({"returns"}));
}

TEST_F(TardiskPolicyParsePolicy, RefusesAFileThatCannotBeOpened) {
  TardiskPolicy policy(tree / "none");
  EXPECT_EQ(
      Parse(policy).Text(),
      Lines({"throws Braxo::Lib::BraxoException: Unable to open policy file " + tree / "none"}));
}

TEST_F(TardiskPolicyParsePolicy, PassesAFailingInodeRecord) {
  TardiskPolicy& policy = Policy("tool", "-E toolLabel toolDom\n");
  host.FailWith("Sysinfo::Get", Every(), DerivedBraxoException("no record"));
  EXPECT_EQ(Parse(policy).Text(), Lines({
                                      BackingAsked(tree / "tool"),
                                      "throws SecPolicyTest::DerivedBraxoException: no record",
                                  }));
}

TEST_F(TardiskPolicyParsePolicy, RefusesAnUnknownKindOfRule) {
  for (const char* kind : {"-X", "-e", "E", "-EE"}) {
    TardiskPolicy& policy = Policy("tool", "\n" + std::string(kind) + " toolLabel toolDom\n");
    EXPECT_EQ(Parse(policy).Text(),
              Lines({
                  BackingAsked(tree / "tool"),
                  "throws Braxo::Lib::BraxoException: Error in parsing policy for domain: " +
                      tree / "tool" + ": 2 : invalid tardisk policy rule type (" + kind + ")",
              }));
  }
}

TEST_F(TardiskPolicyParsePolicy, RefusesAWrongNumberOfWords) {
  for (const char* line : {"-E", "-E toolLabel", "-E toolLabel toolDom grant"}) {
    TardiskPolicy& policy = Policy("tool", line);
    EXPECT_EQ(Parse(policy).Text(),
              Lines({
                  BackingAsked(tree / "tool"),
                  "throws Braxo::Lib::BraxoException: Error in parsing policy for domain: " +
                      tree / "tool" + ": 1 : incorrect number of arguments for this rule type",
              }));
  }
}

TEST_F(TardiskPolicyParsePolicy, RefusesADomainThatIsNotThere) {
  TardiskPolicy& policy = Policy("tool", "\n-E toolLabel noDom\n");
  EXPECT_EQ(Parse(policy).Text(),
            Lines({
                BackingAsked(tree / "tool"),
                FoundDomain("noDom"),
                "throws Braxo::Lib::BraxoException: Error in parsing policy for domain: " +
                    tree / "tool" + ": 2 : Failed to fetch domain id for noDom",
            }));
}

TEST_F(TardiskPolicyParsePolicy, StopsAtABadLineAndKeepsTheRuleBefore) {
  TardiskPolicy& policy = Policy("tool", "-E toolLabel toolDom\n-X\n-E baseLabel toolDom\n");
  EXPECT_EQ(Parse(policy).Text(),
            Lines({
                BackingAsked(tree / "tool"),
                FoundDomain("toolDom"),
                "throws Braxo::Lib::BraxoException: Error in parsing policy for domain: " +
                    tree / "tool" + ": 2 : invalid tardisk policy rule type (-X)",
            }));
  EXPECT_EQ(Set(policy).Text(), Lines({Applied("tool", "toolLabel", 42, 1), "returns"}));
}

TEST_F(TardiskPolicyParsePolicy, IsLeftByAFailingReport) {
  TardiskPolicy& policy = Policy("tool", "-E toolLabel toolDom\n");
  host.SetTardisk(tree / "tool", "");
  host.syslogRunning = false;
  host.Fail("WriteToKlog", "no log");
  const std::string message = "No backing tardisk for policy file " + tree / "tool";
  EXPECT_EQ(Parse(policy).Text(), Lines({
                                      BackingAsked(tree / "tool"),
                                      "stderr " + Quoted("Error: " + message + "\n"),
                                      "WriteToKlog(" + Quoted(message) + R"(, "[ERR]"))",
                                      "throws Braxo::Lib::BraxoException: no log",
                                  }));
}

TEST_F(TardiskPolicySetPolicy, LooksUpTheDomainOfAnUnlabeledTardiskButInstallsNothing) {
  TardiskPolicy& policy = Policy("tool", "-E unlabeled toolDom");
  EXPECT_EQ(Parse(policy).Text(),
            Lines({BackingAsked(tree / "tool"), FoundDomain("toolDom"), "returns"}));
  EXPECT_EQ(Set(policy).Text(), Lines({Labelled("/tardisks/tool.tgz", "unlabeled", 2), "returns"}));
}

// ---- A list of policies.

const std::string kParsed = ReportedInformation("Parsed all the tardisk policy files");
const std::string kSet = ReportedInformation("Set all the tardisk labels and policy");
const std::string kNotParsed = ReportedError("Error in parsing some tardisk policy files");
const std::string kNotSet = ReportedError("Error in setting some tardisk labels and policy");
constexpr char kFailed[] =
    "throws Braxo::Lib::BraxoException: Failure in setting specified tardisk policy";

TEST_F(ParseAndSetTardiskPolicy, ReportsItsTwoStepsForAnEmptyList) {
  EXPECT_EQ(ParseAndSet().Text(), Lines({kParsed, kSet, "returns"}));
}

TEST_F(ParseAndSetTardiskPolicy, ParsesEveryPolicyBeforeItAppliesAny) {
  Policy("tool", "-E toolLabel toolDom\n");
  Policy("base", "\n-E baseLabel toolDom\n");
  EXPECT_EQ(ParseAndSet().Text(), Lines({
                                      BackingAsked(tree / "tool"),
                                      FoundDomain("toolDom"),
                                      BackingAsked(tree / "base"),
                                      FoundDomain("toolDom"),
                                      kParsed,
                                      Applied("tool", "toolLabel", 42, 1),
                                      Applied("base", "baseLabel", 43, 2),
                                      kSet,
                                      "returns",
                                  }));
  EXPECT_EQ(policies.size(), 2U);
}

TEST_F(ParseAndSetTardiskPolicy, AppliesTheFirstOfTwoRules) {
  Policy("tool", "-E toolLabel toolDom\n-E baseLabel toolDom\n");
  EXPECT_EQ(ParseAndSet().Text(), Lines({
                                      BackingAsked(tree / "tool"),
                                      FoundDomain("toolDom"),
                                      ReportedError("Only one rule of this type is allowed"),
                                      kNotParsed,
                                      Applied("tool", "toolLabel", 42, 1),
                                      kSet,
                                      kFailed,
                                  }));
}

TEST_F(ParseAndSetTardiskPolicy, ReportsEveryBadFileAndAppliesTheOthers) {
  Policy("bad", "-X\n");
  Policy("short", "-E toolLabel\n");
  Policy("base", "-E baseLabel toolDom\n");
  EXPECT_EQ(ParseAndSet().Text(),
            Lines({
                BackingAsked(tree / "bad"),
                ReportedError("Error in parsing policy for domain: " + tree / "bad" +
                              ": 1 : invalid tardisk policy rule type (-X)"),
                BackingAsked(tree / "short"),
                ReportedError("Error in parsing policy for domain: " + tree / "short" +
                              ": 1 : incorrect number of arguments for this rule type"),
                BackingAsked(tree / "base"),
                FoundDomain("toolDom"),
                kNotParsed,
                Applied("base", "baseLabel", 43, 1),
                kSet,
                kFailed,
            }));
}

TEST_F(ParseAndSetTardiskPolicy, CountsAFileFromNoTardiskAsParsed) {
  Policy("tool", "-E toolLabel toolDom\n");
  host.SetTardisk(tree / "tool", "");
  EXPECT_EQ(ParseAndSet().Text(),
            Lines({
                BackingAsked(tree / "tool"),
                ReportedError("No backing tardisk for policy file " + tree / "tool"),
                kParsed,
                kSet,
                "returns",
            }));
}

TEST_F(ParseAndSetTardiskPolicy, ReportsAPolicyThatCannotBeAppliedAndGoesOn) {
  Policy("tool", "-E toolLabel toolDom\n");
  Policy("base", "-E baseLabel toolDom\n");
  host.FailErrno("SetXattr", "/tardisks/tool.tgz", ENOENT);
  EXPECT_EQ(ParseAndSet().Text(),
            Lines({
                BackingAsked(tree / "tool"),
                FoundDomain("toolDom"),
                BackingAsked(tree / "base"),
                FoundDomain("toolDom"),
                kParsed,
                Labelled("/tardisks/tool.tgz", "toolLabel", 42),
                ReportedError(tree / "tool" +
                              ":1 : Tardisk: /tardisks/tool.tgz : Unable to set file label "
                              "(toolLabel) for file /tardisks/tool.tgz: No such file or directory"),
                Applied("base", "baseLabel", 43, 1),
                kNotSet,
                kFailed,
            }));
}

TEST_F(ParseAndSetTardiskPolicy, RefusesAnUnknownLabelOnlyWhenItIsSet) {
  Policy("tool", "-E goneLabel toolDom\n");
  host.DeclareLabel("goneLabel", 1);
  EXPECT_EQ(ParseAndSet().Text(),
            Lines({
                BackingAsked(tree / "tool"),
                FoundDomain("toolDom"),
                kParsed,
                R"(LookupLabel("goneLabel", OBJECT))",
                ReportedError(tree / "tool" +
                              ":1 : Tardisk: /tardisks/tool.tgz : Invalid label (goneLabel) for "
                              "file /tardisks/tool.tgz"),
                kNotSet,
                kFailed,
            }));
}

TEST_F(ParseAndSetTardiskPolicy, SaysBothWhenParsingAndSettingFail) {
  Policy("tool", "-E toolLabel toolDom\n-X\n");
  host.Fail("LookupLabel", "no table");
  EXPECT_EQ(ParseAndSet().Text(),
            Lines({
                BackingAsked(tree / "tool"),
                FoundDomain("toolDom"),
                ReportedError("Error in parsing policy for domain: " + tree / "tool" +
                              ": 2 : invalid tardisk policy rule type (-X)"),
                kNotParsed,
                R"(LookupLabel("toolLabel", OBJECT))",
                ReportedError(tree / "tool" + ":1 : Tardisk: /tardisks/tool.tgz : no table"),
                kNotSet,
                kFailed,
            }));
}

TEST_F(ParseAndSetTardiskPolicy, PassesForeignExceptionsWhileParsing) {
  Policy("tool", "-E toolLabel toolDom\n");
  Policy("base", "-E baseLabel toolDom\n");
  host.FailForeign("FindDomain");
  EXPECT_EQ(ParseAndSet().Text(), Lines({
                                      BackingAsked(tree / "tool"),
                                      FoundDomain("toolDom"),
                                      "throws SecPolicyTest::ForeignException: foreign",
                                  }));
}

TEST_F(ParseAndSetTardiskPolicy, PassesForeignExceptionsWhileSetting) {
  Policy("tool", "-E toolLabel toolDom\n");
  host.FailForeign("SetDomTransRule");
  EXPECT_EQ(ParseAndSet().Text(), Lines({
                                      BackingAsked(tree / "tool"),
                                      FoundDomain("toolDom"),
                                      kParsed,
                                      Applied("tool", "toolLabel", 42, 1),
                                      "throws SecPolicyTest::ForeignException: foreign",
                                  }));
}

// The reports of a list with one policy that can be neither parsed nor applied, last first.
TEST_F(ParseAndSetTardiskPolicy, IsLeftByAnyFailingReport) {
  Policy("tool", "-E toolLabel toolDom\n-X\n");
  host.Fail("LookupLabel", "no table");
  host.syslogRunning = false;
  const std::string reports[] = {
      "Error in setting some tardisk labels and policy",
      tree / "tool" + ":1 : Tardisk: /tardisks/tool.tgz : no table",
      "Error in parsing some tardisk policy files",
      "Error in parsing policy for domain: " + tree / "tool" +
          ": 2 : invalid tardisk policy rule type (-X)",
  };
  for (const std::string& report : reports) {
    delete policies.front();
    policies.front() = new TardiskPolicy(tree / "tool");
    host.Fail("WriteToKlog", With(Quoted(report) + ", \"[ERR]\""), "no log: " + report);
    const Transcript run = ParseAndSet();
    EXPECT_EQ(run.trace.back(), "WriteToKlog(" + Quoted(report) + ", \"[ERR]\")");
    EXPECT_EQ(run.exceptionType, "Braxo::Lib::BraxoException");
    EXPECT_EQ(run.exceptionText, "no log: " + report);
  }
}

}  // namespace
}  // namespace SecPolicyTest
