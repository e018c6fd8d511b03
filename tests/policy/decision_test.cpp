// How rules decide: hunts for a rule that has a say and should not, for one that is passed over,
// and for advice that would not grant.

#include "policy/decision.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/message_of.h"

namespace PolicyTest {
namespace {

using Policy::Decide;
using Policy::Decision;
using Policy::EntryQuestion;
using Policy::FileQuestion;
using Policy::InstalledDomain;
using Policy::Level;
using Policy::ParameterQuestion;
using Policy::Permission;
using Policy::Permissions;
using Policy::Rule;
using Policy::RuleKind;
using Policy::WordsQuestion;
using Words = decltype(Rule::words);

Rule Path(const std::string& path, const char* letters) {
  return {.kind = RuleKind::kFilePath, .words = {path}, .verdict = Permissions::Parse(letters)};
}

Rule RuleOf(RuleKind kind, const Words& words, bool grant) {
  return {.kind = kind, .words = words, .verdict = grant};
}

Rule Object(const Words& words, bool grant = true) {
  return RuleOf(RuleKind::kObjectAccess, words, grant);
}

Rule Transition(const Words& words, bool grant = true) {
  return RuleOf(RuleKind::kDomainTransition, words, grant);
}

Rule Parameter(const Words& words, bool grant = true) {
  return RuleOf(RuleKind::kParameterCheck, words, grant);
}

FileQuestion File(Permission permission, std::vector<std::string> paths,
                  const std::string& label = {}) {
  return {.permission = permission, .paths = std::move(paths), .label = label};
}

// "yes: RULE; RULE" of a decision, "no: RULE -> RULE THAT WOULD GRANT" and "no, missing: RULE".
std::string Show(const Decision& decision) {
  std::string text = decision.granted ? "yes" : "no";
  if (!decision.missing.empty()) text += ", missing";
  const char* separator = ": ";
  for (const auto& [rule, instead] : decision.votes) {
    text += separator + rule.Text() + (instead ? " -> " + instead->Text() : "");
    separator = "; ";
  }
  for (const Rule& rule : decision.missing) {
    text += separator + rule.Text();
    separator = "; ";
  }
  return text;
}

struct Case {
  const char* name;
  std::vector<Rule> rules;
  Policy::Question question;
  const char* decision;
};

void ExpectDecisions(std::initializer_list<Case> cases) {
  for (const Case& each : cases) {
    InstalledDomain domain;
    domain.rules = each.rules;
    EXPECT_EQ(Show(Decide(each.question, domain)), each.decision) << each.name;
  }
}

TEST(Decide, TakesTheNearestPathRule) {
  const std::vector<Rule> monitor = {Path("/opt/monitor", "rx"), Path("/opt/monitor/spool", "rw")};
  ExpectDecisions({
      {"the path itself", monitor, File(Permission::kRead, {"/opt/monitor"}),
       "yes: -r /opt/monitor rx"},
      {"beneath it", monitor, File(Permission::kExecute, {"/opt/monitor/bin/x"}),
       "yes: -r /opt/monitor rx"},
      {"the longer one alone", monitor, File(Permission::kWrite, {"/opt/monitor/spool/a"}),
       "yes: -r /opt/monitor/spool rw"},
      {"which takes a letter away", monitor, File(Permission::kExecute, {"/opt/monitor/spool/a"}),
       "no: -r /opt/monitor/spool rw -> -r /opt/monitor/spool rwx"},
      {"in whatever order they are",
       {monitor[1], monitor[0]},
       File(Permission::kExecute, {"/opt/monitor/spool/a"}),
       "no: -r /opt/monitor/spool rw -> -r /opt/monitor/spool rwx"},
      {"not a sibling whose name begins alike", monitor, File(Permission::kRead, {"/opt/monitors"}),
       "no, missing: -r /opt/monitors r"},
      {"not what is above", monitor, File(Permission::kRead, {"/opt"}), "no, missing: -r /opt r"},
      {"everything is beneath the root",
       {Path("/", "r")},
       File(Permission::kRead, {"/a"}),
       "yes: -r / r"},
      {"a rule with a slash at its end",
       {Path("/srv/", "r")},
       File(Permission::kRead, {"/srv/a"}),
       "yes: -r /srv/ r"},
      {"no permissions refuse",
       {Path("/srv", "")},
       File(Permission::kWrite, {"/srv"}),
       "no: -r /srv  -> -r /srv w"},
  });
}

TEST(Decide, AsksForAPathAsItIsWrittenAndAsItResolves) {
  const std::vector<Rule> rules = {Path("/run", "rw"), Path("/var", "r")};
  ExpectDecisions({
      {"both say yes", rules, File(Permission::kRead, {"/var/run", "/run"}),
       "yes: -r /var r; -r /run rw"},
      {"one refuses", rules, File(Permission::kWrite, {"/var/run", "/run"}),
       "no: -r /var r -> -r /var rw"},
      {"one rule votes once", rules, File(Permission::kRead, {"/run/a", "/run/b"}),
       "yes: -r /run rw"},
      {"one is spoken of", rules, File(Permission::kRead, {"/tmp/a", "/run/a"}), "yes: -r /run rw"},
  });
}

TEST(Decide, TakesRulesForTheLabelOfAFile) {
  ExpectDecisions({
      {"read",
       {Object({"key", "read"})},
       File(Permission::kRead, {"/k"}, "key"),
       "yes: -a key read grant"},
      {"write",
       {Object({"key", "write"})},
       File(Permission::kWrite, {"/k"}, "key"),
       "yes: -a key write grant"},
      {"execute",
       {Object({"key", "execute"})},
       File(Permission::kExecute, {"/k"}, "key"),
       "yes: -a key execute grant"},
      {"another access",
       {Object({"key", "list"})},
       File(Permission::kRead, {"/k"}, "key"),
       "no, missing: -r /k r; -a key read grant"},
      {"another label",
       {Object({"door", "read"})},
       File(Permission::kRead, {"/k"}, "key"),
       "no, missing: -r /k r; -a key read grant"},
      {"no label", {Object({"", "read"})}, File(Permission::kRead, {"/k"}), "no, missing: -r /k r"},
      {"of two that disagree the one that refuses",
       {Object({"key", "read"}, false), Path("/k", "r")},
       File(Permission::kRead, {"/k"}, "key"),
       "no: -a key read revoke -> -a key read grant"},
      {"both refuse",
       {Object({"key", "read"}, false), Path("/k", "w")},
       File(Permission::kRead, {"/k"}, "key"),
       "no: -r /k w -> -r /k rw; -a key read revoke -> -a key read grant"},
  });
}

TEST(Decide, AdvisesNoRuleForABuiltInLabel) {
  FileQuestion question = File(Permission::kRead, {"/k"}, "unlabeled");
  question.labelIsBuiltIn = true;
  ExpectDecisions({{"missing", {}, question, "no, missing: -r /k r"}});
}

TEST(Decide, LetsTransitionsExecute) {
  const std::vector<Rule> rules = {Transition({"tool", "toolDom", "exec"}),
                                   Transition({"gate", "toolDom", "enter"}),
                                   Transition({"trap", "toolDom", "exec"}, false)};
  ExpectDecisions({
      {"of the kind exec", rules, File(Permission::kExecute, {"/t"}, "tool"),
       "yes: -d tool toolDom exec grant"},
      {"of another kind", rules, File(Permission::kExecute, {"/t"}, "gate"),
       "no, missing: -r /t x; -a gate execute grant"},
      {"not a revoked one", rules, File(Permission::kExecute, {"/t"}, "trap"),
       "no, missing: -r /t x; -a trap execute grant"},
      {"only to execute", rules, File(Permission::kRead, {"/t"}, "tool"),
       "no, missing: -r /t r; -a tool read grant"},
  });
}

TEST(Decide, NeedsOneTransitionToEnterADomain) {
  const Rule granted = Transition({"tool", "toolDom", "exec"});
  const Rule revoked = Transition({"trap", "toolDom", "exec"}, false);
  const EntryQuestion question = {.domain = "toolDom", .ways = {}};
  ExpectDecisions({
      {"one that grants", {granted}, question, "yes: -d tool toolDom exec grant"},
      {"beside one that does not", {revoked, granted}, question, "yes: -d tool toolDom exec grant"},
      {"none that grants",
       {revoked},
       question,
       "no: -d trap toolDom exec revoke -> -d trap toolDom exec grant"},
      {"into another domain",
       {Transition({"tool", "otherDom", "exec"})},
       question,
       "no, missing: -d OBJECT toolDom exec grant"},
      {"the ways of others",
       {},
       EntryQuestion{.domain = "toolDom", .ways = {granted}},
       "no, missing: -d tool toolDom exec grant"},
  });
}

TEST(Decide, ComparesNumbersWithRanges) {
  const std::vector<Rule> rules = {Parameter({"bind_port", "80", "0x1bb"}),
                                   Parameter({"bind_port", "1"}, false),
                                   Parameter({"set_uid", "7"})};
  const auto port = [](const char* number) { return ParameterQuestion{"bind_port", number}; };
  ExpectDecisions({
      {"first", rules, port("80"), "yes: -p bind_port 80 0x1bb grant"},
      {"last, hexadecimal", rules, port("0x1BB"), "yes: -p bind_port 80 0x1bb grant"},
      {"beyond", rules, port("444"), "no, missing: -p bind_port 444 grant"},
      {"as it is asked", rules, port("0x7"), "no, missing: -p bind_port 0x7 grant"},
      {"one value", rules, port("1"), "no: -p bind_port 1 revoke -> -p bind_port 1 grant"},
  });
}

TEST(Decide, RefusesANumberThatIsNone) {
  InstalledDomain domain;
  domain.rules = {Parameter({"bind_port", "80"})};
  EXPECT_EQ(SecPolicyTest::MessageOf([&] {
              Decide(ParameterQuestion{"bind_port", "many"}, domain);
            }),
            "parameter 'many' is not an unsigned number");
}

TEST(Decide, TakesRulesOfExactlyTheWords) {
  const std::vector<Rule> rules = {RuleOf(RuleKind::kSyscall, {"bind"}, true),
                                   RuleOf(RuleKind::kCapability, {"cap_kill"}, false),
                                   RuleOf(RuleKind::kFileCreation, {"a", "b", "fifo"}, true),
                                   RuleOf(RuleKind::kUnixSocketCreation, {"a", "stream"}, true)};
  ExpectDecisions({
      {"call", rules, WordsQuestion{RuleKind::kSyscall, {"bind"}}, "yes: -s bind grant"},
      {"another call", rules, WordsQuestion{RuleKind::kSyscall, {"read"}},
       "no, missing: -s read grant"},
      {"capability", rules, WordsQuestion{RuleKind::kCapability, {"cap_kill"}},
       "no: -c cap_kill revoke -> -c cap_kill grant"},
      {"the same word of another kind", rules, WordsQuestion{RuleKind::kSyscall, {"cap_kill"}},
       "no, missing: -s cap_kill grant"},
      {"creation", rules, WordsQuestion{RuleKind::kFileCreation, {"a", "b", "fifo"}},
       "yes: -f a b fifo grant"},
      {"the words in another order", rules,
       WordsQuestion{RuleKind::kFileCreation, {"b", "a", "fifo"}},
       "no, missing: -f b a fifo grant"},
      {"socket", rules, WordsQuestion{RuleKind::kUnixSocketCreation, {"a", "stream"}},
       "yes: -u a stream grant"},
  });
}

TEST(Decide, LetsEverythingPassThatIsNotEnforced) {
  const std::pair<Level, bool> levels[] = {
      {Level::kEnforcing, false}, {Level::kPermissive, true}, {Level::kDisabled, true}};
  for (const auto& [level, allowed] : levels) {
    InstalledDomain domain;
    domain.level = level;
    const Decision decision = Decide(WordsQuestion{RuleKind::kSyscall, {"bind"}}, domain);
    EXPECT_EQ(decision.IsAllowed(), allowed) << TextOf(level);
    EXPECT_FALSE(decision.granted) << TextOf(level);
  }
}

TEST(Decide, AllowsWhatIsGranted) {
  InstalledDomain domain;
  domain.rules = {RuleOf(RuleKind::kSyscall, {"bind"}, true)};
  EXPECT_TRUE(Decide(WordsQuestion{RuleKind::kSyscall, {"bind"}}, domain).IsAllowed());
}

}  // namespace
}  // namespace PolicyTest
