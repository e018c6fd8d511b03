// The policy of one domain: which line goes to which kind of rules, where a bad line or a refusal
// ends it, in which order rules are checked, set, read and printed.

#include "secpolicy/domain/domain_policy.h"

#include <typeinfo>

#include "domain/rule_families.h"
#include "secpolicy/domain/capability_param_rules.h"
#include "secpolicy/domain/capability_rules.h"
#include "secpolicy/domain/dom_trans_rules.h"
#include "secpolicy/domain/file_creation_rules.h"
#include "secpolicy/domain/file_path_access_rules.h"
#include "secpolicy/domain/object_access_rules.h"
#include "secpolicy/domain/syscall_rules.h"
#include "secpolicy/domain/unix_sock_creation_rules.h"
#include "secpolicy/secpolicy.h"
#include "support/policy_tree.h"
#include "support/print.h"

namespace SecPolicyTest {
namespace {

using SecPolicy::DomainPolicy;
using SecPolicy::PolicyRules;

using ParsedFile = std::map<unsigned int, std::queue<std::string>>;

// A rule set that only shows in the trace what is asked of it, and fails as scripted.
class ObservedRules : public virtual PolicyRules {
 public:
  void AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
               std::queue<std::string> args, TeskAccessInterfaceImpl&) override {
    std::string words;
    for (; !args.empty(); args.pop()) words += ", " + args.front();
    ScriptedHost::Current().Enter("AddRule",
                                  keyword + ", " + Arguments(line, domainName, domainId) + words);
  }
  void Set(TeskAccessInterfaceImpl&) override { Enter("Set"); }
  void ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl&) override {
    ScriptedHost::Current().Enter("ReadSystemRules", keyword + ", " + Print(domainId));
  }
  void CheckConstraints(const std::string& domainName, TeskAccessInterfaceImpl&) override {
    ScriptedHost::Current().Enter("CheckConstraints", keyword + ", " + Print(domainName));
  }
  void PrintRules() override { Enter("PrintRules"); }
  ~ObservedRules() override { ScriptedHost::Current().Note("~PolicyRules", keyword); }

 private:
  void Enter(const std::string& call) const { ScriptedHost::Current().Enter(call, keyword); }
};

void Observe(DomainPolicy& policy) {
  for (auto& [keyword, rules] : policy.ruleSets) {
    rules = std::make_unique<ObservedRules>();
    rules->keyword = keyword;
  }
}

class DomainPolicyTest : public testing::Test {
 protected:
  std::string Parse(const std::string& text) {
    tree.Write("domain", text);
    policy.policyFile = tree / "domain";
    return Record([&] { policy.ParsePolicy(access); }).Text();
  }
  std::string Process(ParsedFile& parsed) {
    return Record([&] { policy.ProcessParsedPolicyFile(access, parsed); }).Text();
  }
  std::string Check() {
    return Record([&] { policy.CheckPolicyConstraints(access); }).Text();
  }
  std::string Set() {
    return Record([&] { policy.SetPolicy(access); }).Text();
  }
  std::string Read() {
    return Record([&] { policy.ReadSystemPolicy(access); }).Text();
  }
  std::string Printed() {
    return Record([&] { policy.PrintPolicy(); }).Text();
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  PolicyTree tree;
  DomainPolicy policy{"foo", 42};
};

// ---- Construction and shape.

TEST_F(DomainPolicyTest, StartsWithNameAndIdentifierOnly) {
  EXPECT_EQ(policy.name, "foo");
  EXPECT_EQ(policy.id, 42u);
  EXPECT_EQ(policy.policyFile, "");
  EXPECT_FALSE(policy.hasErrors);
}

template <class Rules>
bool Is(const PolicyRules& rules) {
  return typeid(rules) == typeid(Rules);
}

TEST_F(DomainPolicyTest, HasOneRuleSetForEachKeyword) {
  EXPECT_EQ(policy.ruleSets.size(), 8u);
  for (const auto& [keyword, rules] : policy.ruleSets) EXPECT_EQ(rules->keyword, keyword);

  EXPECT_TRUE(Is<SecPolicy::SyscallRules>(*policy.ruleSets.at("-s")));
  EXPECT_TRUE(Is<SecPolicy::CapabilityRules>(*policy.ruleSets.at("-c")));
  EXPECT_TRUE(Is<SecPolicy::CapabilityParamRules>(*policy.ruleSets.at("-p")));
  EXPECT_TRUE(Is<SecPolicy::ObjectAccessRules>(*policy.ruleSets.at("-a")));
  EXPECT_TRUE(Is<SecPolicy::DomTransRules>(*policy.ruleSets.at("-d")));
  EXPECT_TRUE(Is<SecPolicy::FileCreationRules>(*policy.ruleSets.at("-f")));
  EXPECT_TRUE(Is<SecPolicy::UnixSockCreationRules>(*policy.ruleSets.at("-u")));
  EXPECT_TRUE(Is<SecPolicy::FilePathAccessRules>(*policy.ruleSets.at("-r")));
}

TEST_F(DomainPolicyTest, StartsWithEmptyRuleSets) {
  EXPECT_EQ(Set(), "returns\n");
  EXPECT_EQ(Printed(), Lines({R"(stdout "\n")", "returns"}));
}

// The fields in their order, with plain pointers.
struct Layout {
  unsigned int id;
  std::string name;
  std::string policyFile;
  bool hasErrors;
  std::map<std::string, PolicyRules*> ruleSets;
};

TEST_F(DomainPolicyTest, IsPlainClassWithFieldsInOrder) {
  EXPECT_FALSE(std::is_polymorphic_v<DomainPolicy>);
  EXPECT_EQ(sizeof(DomainPolicy), sizeof(Layout));

  const Layout layout{};
  const auto distance = [](const auto& object, const auto& field) {
    return reinterpret_cast<const char*>(&field) - reinterpret_cast<const char*>(&object);
  };
  EXPECT_EQ(distance(policy, policy.id), distance(layout, layout.id));
  EXPECT_EQ(distance(policy, policy.name), distance(layout, layout.name));
  EXPECT_EQ(distance(policy, policy.policyFile), distance(layout, layout.policyFile));
  EXPECT_EQ(distance(policy, policy.hasErrors), distance(layout, layout.hasErrors));
  EXPECT_EQ(distance(policy, policy.ruleSets), distance(layout, layout.ruleSets));
}

TEST_F(DomainPolicyTest, DeletesRuleSets) {
  const Transcript run = Record([] {
    DomainPolicy temporary("foo", 42);
    Observe(temporary);
  });
  EXPECT_THAT(run.trace, testing::UnorderedElementsAre("~PolicyRules(-a)", "~PolicyRules(-c)",
                                                       "~PolicyRules(-d)", "~PolicyRules(-f)",
                                                       "~PolicyRules(-p)", "~PolicyRules(-r)",
                                                       "~PolicyRules(-s)", "~PolicyRules(-u)"));
}

TEST_F(DomainPolicyTest, DeletesRuleSetsBesideMissingOne) {
  const Transcript run = Record([] {
    DomainPolicy temporary("foo", 42);
    Observe(temporary);
    temporary.ruleSets["-s"].reset();
    ScriptedHost::Current().Note("leave", "");
  });
  ASSERT_EQ(run.trace.size(), 9u);
  EXPECT_EQ(run.trace[0], "~PolicyRules(-s)");
  EXPECT_EQ(run.trace[1], "leave()");
}

// ---- ParsePolicy.

TEST_F(DomainPolicyTest, NeedsPolicyFile) {
  EXPECT_EQ(Record([&] { policy.ParsePolicy(access); }).Text(),
            "throws Braxo::Lib::BraxoException: Policy file path has not been set for domain "
            "foo\n");
}

TEST_F(DomainPolicyTest, PassesOnUnreadablePolicyFile) {
  policy.policyFile = tree / "missing";
  EXPECT_EQ(
      Record([&] { policy.ParsePolicy(access); }).Text(),
      "throws Braxo::Lib::BraxoException: Unable to open policy file " + (tree / "missing") + "\n");
}

TEST_F(DomainPolicyTest, GivesEachLineToRuleSetOfItsKeyword) {
  host.DeclareDomain("targetDom");
  EXPECT_EQ(
      Parse("# every kind\n"
            "-u sockLabel stream grant\n"
            "-s read grant\n"
            "-r /bin/ls rx # tool\n"
            "\n"
            "-p bind_port 80 443 grant\n"
            "-f dirLabel fileLabel regular grant\n"
            "  -d toolLabel  targetDom exec revoke\n"
            "-c cap_kill revoke\n"
            "-a toolLabel execute grant"),
      Lines({R"(ValidateKeyword(LABEL, "sockLabel"))",
             R"(ValidateKeyword(UNIX_SOCK_CREATION, "stream"))",
             R"(ValidateKeyword(SYSCALL, "read"))", R"(ValidateKeyword(PARAM_CHECK, "bind_port"))",
             R"(ValidateKeyword(LABEL, "dirLabel"))", R"(ValidateKeyword(LABEL, "fileLabel"))",
             R"(ValidateKeyword(FILE_CREATION, "regular"))", R"(FindDomain("targetDom"))",
             R"(ValidateKeyword(LABEL, "toolLabel"))", R"(ValidateKeyword(DOM_TRANS, "exec"))",
             R"(ValidateKeyword(CAPABILITY, "cap_kill"))", R"(ValidateKeyword(LABEL, "toolLabel"))",
             R"(ValidateKeyword(OBJECT_ACCESS, "execute"))", "returns"}));

  // Set and printed by keyword, whatever the order of the lines.
  EXPECT_EQ(
      Set(),
      Lines(
          {R"(SetObjectAccessRule({line: 10, domainId: 42, domainName: "foo", label: "toolLabel", accessKind: "execute", grant: true}))",
           R"(SetCapabilityRule({line: 9, domainId: 42, domainName: "foo", capability: "cap_kill", grant: false}))",
           R"(SetDomTransRule({line: 8, domainId: 42, domainName: "foo", label: "toolLabel", targetDomain: "targetDom", targetDomainId: 1, transitionKind: "exec", grant: false}))",
           R"(SetFileCreationRule({line: 7, domainId: 42, domainName: "foo", label: "dirLabel", secondLabel: "fileLabel", creationKind: "regular", grant: true}))",
           R"(SetCapabilityParamRule({line: 6, domainId: 42, domainName: "foo", paramCheck: "bind_port", firstParam: "80", secondParam: "443", grant: true}))",
           R"(RealPath("/bin/ls"))",
           R"(Call(0x405f, 0, 42, [{"/bin/ls", 17}, {"/bin/ls", 17}], 2, &out))",
           R"(SetSyscallRule({line: 3, domainId: 42, domainName: "foo", syscall: "read", grant: true}))",
           R"(SetUnixSockCreationRule({line: 2, domainId: 42, domainName: "foo", label: "sockLabel", sockKind: "stream", grant: true}))",
           "returns"}));
  EXPECT_EQ(Printed(), Lines({R"(stdout "-a toolLabel execute grant\n")",
                              R"(stdout "\n")",
                              R"(stdout "\n")",
                              R"(stdout "-c cap_kill revoke\n")",
                              R"(stdout "\n")",
                              R"(stdout "\n")",
                              R"(stdout "-d toolLabel targetDom exec revoke\n")",
                              R"(stdout "\n")",
                              R"(stdout "\n")",
                              R"(stdout "-f dirLabel fileLabel regular grant\n")",
                              R"(stdout "\n")",
                              R"(stdout "\n")",
                              R"(stdout "-p bind_port 80 443 grant\n")",
                              R"(stdout "\n")",
                              R"(stdout "\n")",
                              R"(stdout "-r /bin/ls rx\n")",
                              R"(stdout "\n")",
                              R"(stdout "\n")",
                              R"(stdout "-s read grant\n")",
                              R"(stdout "\n")",
                              R"(stdout "\n")",
                              R"(stdout "-u sockLabel stream grant\n")",
                              R"(stdout "\n")",
                              R"(stdout "\n")",
                              R"(stdout "\n")",
                              "returns"}));
}

TEST_F(DomainPolicyTest, LeavesRuleSetsEmptyForFileWithoutRules) {
  EXPECT_EQ(Parse("\n   \n# -s read grant\n  # comment\n"), "returns\n");
  EXPECT_EQ(Check(), Lines({R"(CheckCapabilityParamRuleConstraints("foo", []))", "returns"}));
  EXPECT_EQ(Set(), "returns\n");

  Observe(policy);
  EXPECT_EQ(Set(), Lines({"Set(-a)", "Set(-c)", "Set(-d)", "Set(-f)", "Set(-p)", "Set(-r)",
                          "Set(-s)", "Set(-u)", "returns"}));
}

TEST_F(DomainPolicyTest, StopsAtFirstBadLineAndKeepsRulesBefore) {
  EXPECT_EQ(Parse("-s one grant\n-s two grant\n-s three grant\n-s four grant\n-s five grant\n"
                  "-s six grant\n-s seven\n-s eight grant\n-x nine\n-s ten grant\n"),
            Lines({R"(ValidateKeyword(SYSCALL, "one"))", R"(ValidateKeyword(SYSCALL, "two"))",
                   R"(ValidateKeyword(SYSCALL, "three"))", R"(ValidateKeyword(SYSCALL, "four"))",
                   R"(ValidateKeyword(SYSCALL, "five"))", R"(ValidateKeyword(SYSCALL, "six"))",
                   "throws Braxo::Lib::BraxoException: Error in parsing policy for domain: foo: 7 "
                   ": incorrect number of arguments for this rule type"}));
  EXPECT_FALSE(policy.hasErrors);
  EXPECT_EQ(Printed(), Lines({R"(stdout "-s one grant\n")", R"(stdout "-s two grant\n")",
                              R"(stdout "-s three grant\n")", R"(stdout "-s four grant\n")",
                              R"(stdout "-s five grant\n")", R"(stdout "-s six grant\n")",
                              R"(stdout "\n")", R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

// The reader cuts the line at 1023 characters, which takes the permissions and the lines behind.
TEST_F(DomainPolicyTest, KeepsFirst1020CharactersOfLongPathAndNothingAfter) {
  const std::string path = "/" + std::string(1999, 'a');
  const std::string cut = "/" + std::string(1019, 'a');
  EXPECT_EQ(Parse("-s one grant\n-r " + path + " rwx\n-s two grant\n"),
            Lines({R"(ValidateKeyword(SYSCALL, "one"))", "returns"}));
  EXPECT_EQ(
      Set(),
      Lines(
          {"RealPath(\"" + cut + "\")",
           "Call(0x405f, 0, 42, [{\"" + cut + "\", 0}, {\"" + cut + "\", 0}], 2, &out)",
           R"(SetSyscallRule({line: 1, domainId: 42, domainName: "foo", syscall: "one", grant: true}))",
           "returns"}));
}

TEST_F(DomainPolicyTest, AddsToRulesThatAreThere) {
  EXPECT_EQ(Parse("-s one grant\n"), Lines({R"(ValidateKeyword(SYSCALL, "one"))", "returns"}));
  EXPECT_EQ(Parse("-s two grant\n"), Lines({R"(ValidateKeyword(SYSCALL, "two"))", "returns"}));
  EXPECT_EQ(Printed(), Lines({R"(stdout "-s one grant\n")", R"(stdout "-s two grant\n")",
                              R"(stdout "\n")", R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

// ---- ProcessParsedPolicyFile.

TEST_F(DomainPolicyTest, HandsOutLinesInAscendingOrderWithoutTheirKeyword) {
  Observe(policy);
  ParsedFile parsed = {{900, Words("-a one two")}, {3, Words("-u")}, {12, Words("-r /path -s")}};

  EXPECT_EQ(Process(parsed),
            Lines({R"(AddRule(-u, 3, "foo", 42))", R"(AddRule(-r, 12, "foo", 42, /path, -s))",
                   R"(AddRule(-a, 900, "foo", 42, one, two))", "returns"}));
}

TEST_F(DomainPolicyTest, TakesOnlyKeywordOffTheLines) {
  ParsedFile parsed = {{3, Words("-s read grant")}};
  Process(parsed);
  EXPECT_EQ(parsed, (ParsedFile{{3, Words("read grant")}}));
}

TEST_F(DomainPolicyTest, SkipsLinesWithoutWords) {
  Observe(policy);
  ParsedFile parsed = {{1, {}}, {2, Words("-s read")}, {3, {}}};
  EXPECT_EQ(Process(parsed), Lines({R"(AddRule(-s, 2, "foo", 42, read))", "returns"}));
}

TEST_F(DomainPolicyTest, RefusesUnknownKeyword) {
  Observe(policy);
  for (const std::string word : {"-x", "s", "-S", "-", "--s", "-ss", "-E", "-s\t"}) {
    ParsedFile parsed = {{11, Words("-s read")}, {12, {}}, {13, Words("-s write")}};
    parsed[12].push(word);
    parsed[12].push("read");
    EXPECT_EQ(Process(parsed),
              Lines({R"(AddRule(-s, 11, "foo", 42, read))",
                     "throws SecPolicy::LineFailure: Error in parsing policy for domain: foo: "
                     "12 : invalid policy rule type (" +
                         word + ")"}));
  }
  EXPECT_EQ(policy.ruleSets.size(), 8u);
}

TEST_F(DomainPolicyTest, PassesOnExceptionOfRuleSetAsItIs) {
  Observe(policy);
  host.FailWith("AddRule", Nth(2), DerivedBraxoException("bad line"));
  host.FailForeign("AddRule", Nth(3));

  ParsedFile parsed = {{1, Words("-a")}, {2, Words("-c")}, {3, Words("-d")}};
  EXPECT_EQ(Process(parsed), Lines({R"(AddRule(-a, 1, "foo", 42))", R"(AddRule(-c, 2, "foo", 42))",
                                    "throws SecPolicyTest::DerivedBraxoException: bad line"}));
  parsed = {{1, Words("-a")}, {2, Words("-c")}};
  EXPECT_EQ(Process(parsed), Lines({R"(AddRule(-a, 1, "foo", 42))",
                                    "throws SecPolicyTest::ForeignException: foreign"}));
}

// ---- CheckPolicyConstraints.

TEST_F(DomainPolicyTest, ChecksRuleSetsInKeywordOrder) {
  Observe(policy);
  EXPECT_EQ(Check(),
            Lines({R"(CheckConstraints(-a, "foo"))", R"(CheckConstraints(-c, "foo"))",
                   R"(CheckConstraints(-d, "foo"))", R"(CheckConstraints(-f, "foo"))",
                   R"(CheckConstraints(-p, "foo"))", R"(CheckConstraints(-r, "foo"))",
                   R"(CheckConstraints(-s, "foo"))", R"(CheckConstraints(-u, "foo"))", "returns"}));
}

TEST_F(DomainPolicyTest, EndsCheckAtFirstFailure) {
  Observe(policy);
  host.FailWith("CheckConstraints", Nth(3), DerivedBraxoException("conflict"));
  host.FailForeign("CheckConstraints", Nth(5));

  EXPECT_EQ(Check(), Lines({R"(CheckConstraints(-a, "foo"))", R"(CheckConstraints(-c, "foo"))",
                            R"(CheckConstraints(-d, "foo"))",
                            "throws SecPolicyTest::DerivedBraxoException: conflict"}));
  EXPECT_FALSE(policy.hasErrors);
  EXPECT_EQ(Check(), Lines({R"(CheckConstraints(-a, "foo"))", R"(CheckConstraints(-c, "foo"))",
                            "throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_F(DomainPolicyTest, PassesOnConflictOfParameterChecks) {
  host.Fail("CheckCapabilityParamRuleConstraints", "80 granted and revoked");
  EXPECT_EQ(Check(), Lines({R"(CheckCapabilityParamRuleConstraints("foo", []))",
                            "throws Braxo::Lib::BraxoException: Policy constraint error for "
                            "domain: foo : 80 granted and revoked"}));
}

// ---- SetPolicy.

TEST_F(DomainPolicyTest, InstallsNothingWhileItHasErrors) {
  Observe(policy);
  policy.hasErrors = true;
  EXPECT_EQ(Set(),
            "throws Braxo::Lib::BraxoException: Skipping the policy for domain foo due to errors "
            "in the policy\n");

  policy.hasErrors = false;
  EXPECT_EQ(Set(), Lines({"Set(-a)", "Set(-c)", "Set(-d)", "Set(-f)", "Set(-p)", "Set(-r)",
                          "Set(-s)", "Set(-u)", "returns"}));
}

TEST_F(DomainPolicyTest, EndsSetAtFirstFailure) {
  Observe(policy);
  host.FailWith("Set", Nth(2), DerivedBraxoException("refused"));
  host.FailForeign("Set", Nth(5));

  EXPECT_EQ(Set(),
            Lines({"Set(-a)", "Set(-c)", "throws SecPolicyTest::DerivedBraxoException: refused"}));
  EXPECT_EQ(Set(), Lines({"Set(-a)", "Set(-c)", "Set(-d)",
                          "throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_F(DomainPolicyTest, KeepsRuleSetsInstalledBeforeRefusal) {
  Parse("-s read grant\n-c cap_kill grant\n-a toolLabel execute grant\n");
  host.Fail("SetCapabilityRule", "no room");

  EXPECT_EQ(
      Set(),
      Lines(
          {R"(SetObjectAccessRule({line: 3, domainId: 42, domainName: "foo", label: "toolLabel", accessKind: "execute", grant: true}))",
           R"(SetCapabilityRule({line: 2, domainId: 42, domainName: "foo", capability: "cap_kill", grant: true}))",
           "throws Braxo::Lib::BraxoException: Error in setting policy for domain: foo: 2 : no "
           "room"}));
}

TEST_F(DomainPolicyTest, PassesOnBadPermissionsWithoutDomainAndLine) {
  Parse("-r /bin/ls rwxr\n-s read grant\n");
  EXPECT_EQ(Set(), Lines({R"(RealPath("/bin/ls"))",
                          "throws Braxo::Lib::BraxoException: Please enter the permissions from "
                          "[rwx]."}));
}

// ---- ReadSystemPolicy.

TEST_F(DomainPolicyTest, ReadsRuleSetsInKeywordOrder) {
  EXPECT_EQ(Read(), Lines({"GetObjectAccessRules(42)", "GetCapabilityRules(42)",
                           "GetDomTransRules(42)", "GetFileCreationRules(42)",
                           "GetCapabilityParamRules(42)", "GetFilePathAccessRules(42)",
                           "GetSyscallRules(42)", "GetUnixSockCreationRules(42)", "returns"}));
}

TEST_F(DomainPolicyTest, ReportsRuleSetThatCannotBeReadAndGoesOn) {
  host.rules[42].syscall = {{0, 42, "foo", "read", true}};
  host.Fail("GetCapabilityRules", "table unreadable");
  host.FailWith("GetUnixSockCreationRules", Every(), DerivedBraxoException("also unreadable"));

  EXPECT_EQ(Read(),
            Lines({"GetObjectAccessRules(42)", "GetCapabilityRules(42)",
                   R"(stderr "Error: table unreadable\n")",
                   R"(syslog(LOG_ERR, "Error: %s", "table unreadable"))", "GetDomTransRules(42)",
                   "GetFileCreationRules(42)", "GetCapabilityParamRules(42)",
                   "GetFilePathAccessRules(42)", "GetSyscallRules(42)",
                   "GetUnixSockCreationRules(42)", R"(stderr "Error: also unreadable\n")",
                   R"(syslog(LOG_ERR, "Error: %s", "also unreadable"))", "returns"}));
  EXPECT_EQ(Printed(), Lines({R"(stdout "-s read grant\n")", R"(stdout "\n")", R"(stdout "\n")",
                              R"(stdout "\n")", "returns"}));
}

TEST_F(DomainPolicyTest, PassesOnForeignExceptionOfReading) {
  Observe(policy);
  host.FailForeign("ReadSystemRules", Nth(2));
  EXPECT_EQ(Read(), Lines({"ReadSystemRules(-a, 42)", "ReadSystemRules(-c, 42)",
                           "throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_F(DomainPolicyTest, PassesOnExceptionOfReportOfReading) {
  Observe(policy);
  host.syslogRunning = false;
  host.Fail("WriteToKlog", "log full");
  host.Fail("ReadSystemRules", Nth(2), "unreadable");
  EXPECT_EQ(Read(),
            Lines({"ReadSystemRules(-a, 42)", "ReadSystemRules(-c, 42)",
                   R"(stderr "Error: unreadable\n")", R"(WriteToKlog("unreadable", "[ERR]"))",
                   "throws Braxo::Lib::BraxoException: log full"}));
}

// ---- PrintPolicy.

TEST_F(DomainPolicyTest, PrintsRuleSetsInKeywordOrderAndEmptyLine) {
  Observe(policy);
  EXPECT_EQ(Printed(), Lines({"PrintRules(-a)", "PrintRules(-c)", "PrintRules(-d)",
                              "PrintRules(-f)", "PrintRules(-p)", "PrintRules(-r)",
                              "PrintRules(-s)", "PrintRules(-u)", R"(stdout "\n")", "returns"}));
}

TEST_F(DomainPolicyTest, PrintsTwoEmptyLinesAfterEachRuleSetAndOneMore) {
  host.rules[42].syscall = {{0, 42, "foo", "read", true}, {0, 42, "foo", "write", false}};
  host.rules[42].filePathAccess = {{0, 42, "foo", "/bin/ls", "rx"}};
  policy.ReadSystemPolicy(access);
  Printed();

  EXPECT_EQ(host.StandardOutput(),
            "-r /bin/ls rx\n"
            "\n"
            "\n"
            "-s read grant\n"
            "-s write revoke\n"
            "\n"
            "\n"
            "\n");
}

}  // namespace
}  // namespace SecPolicyTest
