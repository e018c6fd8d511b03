// How rules decide: hunts for a rule that has a say and should not, for one that is passed over,
// and for advice that would not grant.

#include "policy/decision.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/message_of.h"

namespace PolicyTest {
namespace {

using Policy::CreationQuestion;
using Policy::Decide;
using Policy::Decision;
using Policy::EntryQuestion;
using Policy::FileAccess;
using Policy::FileQuestion;
using Policy::InstalledDomain;
using Policy::Level;
using Policy::ParameterQuestion;
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

FileQuestion File(FileAccess access, const std::string& path, const std::string& label = {}) {
  return {.access = access, .path = path, .label = label};
}

CreationQuestion Creation(const char* what, const std::string& path,
                          const std::string& label = {}) {
  return {.what = what, .path = path, .directoryLabel = label};
}

// "yes: RULE; RULE" of a decision, "no: RULE -> RULE THAT WOULD GRANT" and "no, missing: RULE".
std::string Show(const Decision& decision) {
  std::string text = decision.granted ? "yes" : "no";
  if (decision.isOpen) text += ", open";
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
      {"the path itself", monitor, File(FileAccess::kRead, "/opt/monitor"),
       "yes: -r /opt/monitor rx"},
      {"beneath it", monitor, File(FileAccess::kExecute, "/opt/monitor/bin/x"),
       "yes: -r /opt/monitor rx"},
      {"the longer one alone", monitor, File(FileAccess::kWrite, "/opt/monitor/spool/a"),
       "yes: -r /opt/monitor/spool rw"},
      {"which takes a letter away", monitor, File(FileAccess::kExecute, "/opt/monitor/spool/a"),
       "no: -r /opt/monitor/spool rw -> -r /opt/monitor/spool rwx"},
      {"in whatever order they are",
       {monitor[1], monitor[0]},
       File(FileAccess::kExecute, "/opt/monitor/spool/a"),
       "no: -r /opt/monitor/spool rw -> -r /opt/monitor/spool rwx"},
      {"not a sibling whose name begins alike", monitor, File(FileAccess::kRead, "/opt/monitors"),
       "no, missing: -r /opt/monitors r"},
      {"not what is above", monitor, File(FileAccess::kRead, "/opt"), "no, missing: -r /opt r"},
      {"everything is beneath the root",
       {Path("/", "r")},
       File(FileAccess::kRead, "/a"),
       "yes: -r / r"},
      {"a rule with a slash at its end",
       {Path("/srv/", "r")},
       File(FileAccess::kRead, "/srv/a"),
       "yes: -r /srv/ r"},
      {"no permissions refuse",
       {Path("/srv", "")},
       File(FileAccess::kWrite, "/srv"),
       "no: -r /srv  -> -r /srv w"},
  });
}

TEST(Decide, TakesRulesForTheLabelOfAFile) {
  ExpectDecisions({
      {"read",
       {Object({"key", "read"})},
       File(FileAccess::kRead, "/k", "key"),
       "yes: -a key read grant"},
      {"write",
       {Object({"key", "write"})},
       File(FileAccess::kWrite, "/k", "key"),
       "yes: -a key write grant"},
      {"execute",
       {Object({"key", "execute"})},
       File(FileAccess::kExecute, "/k", "key"),
       "yes: -a key execute grant"},
      {"another access",
       {Object({"key", "list"})},
       File(FileAccess::kRead, "/k", "key"),
       "no, missing: -r /k r; -a key read grant"},
      {"another label",
       {Object({"door", "read"})},
       File(FileAccess::kRead, "/k", "key"),
       "no, missing: -r /k r; -a key read grant"},
      {"no label", {Object({"", "read"})}, File(FileAccess::kRead, "/k"), "no, missing: -r /k r"},
      {"of two that disagree the one that refuses",
       {Object({"key", "read"}, false), Path("/k", "r")},
       File(FileAccess::kRead, "/k", "key"),
       "no: -a key read revoke -> -a key read grant"},
      {"both refuse",
       {Object({"key", "read"}, false), Path("/k", "w")},
       File(FileAccess::kRead, "/k", "key"),
       "no: -r /k w -> -r /k rw; -a key read revoke -> -a key read grant"},
  });
}

TEST(Decide, AdvisesNoRuleForABuiltInLabel) {
  FileQuestion question = File(FileAccess::kRead, "/k", "unlabeled");
  question.labelIsBuiltIn = true;
  ExpectDecisions({{"missing", {}, question, "no, missing: -r /k r"}});
}

TEST(Decide, LetsTransitionsExecute) {
  const std::vector<Rule> rules = {Transition({"tool", "toolDom", "exec"}),
                                   Transition({"gate", "toolDom", "enter"}),
                                   Transition({"trap", "toolDom", "exec"}, false)};
  ExpectDecisions({
      {"of the kind exec", rules, File(FileAccess::kExecute, "/t", "tool"),
       "yes: -d tool toolDom exec grant"},
      {"of another kind", rules, File(FileAccess::kExecute, "/t", "gate"),
       "no, missing: -r /t x; -a gate execute grant"},
      {"not a revoked one", rules, File(FileAccess::kExecute, "/t", "trap"),
       "no, missing: -r /t x; -a trap execute grant"},
      {"only to execute", rules, File(FileAccess::kRead, "/t", "tool"),
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

TEST(Decide, LetsACheckPassThatNoRuleGrantsAValueOf) {
  const auto port = [](const char* number) { return ParameterQuestion{"bind_port", number}; };
  const Rule low = Parameter({"bind_port", "0", "1023"}, false);
  ExpectDecisions({
      {"no rule", {}, port("80"), "yes, open"},
      {"another check", {Parameter({"set_uid", "7"})}, port("80"), "yes, open"},
      {"what is not revoked", {low}, port("1024"), "yes, open"},
      {"what is",
       {low},
       port("1023"),
       "no: -p bind_port 0 1023 revoke -> -p bind_port 0 1023 grant"},
      {"with one grant what is not granted",
       {low, Parameter({"bind_port", "8080"})},
       port("1024"),
       "no, missing: -p bind_port 1024 grant"},
  });
}

TEST(Decide, TakesCloneFlagsAsBits) {
  const auto flags = [](const char* number) { return ParameterQuestion{"clone_flags", number}; };
  const std::vector<Rule> rules = {Parameter({"clone_flags", "0x300"}),
                                   Parameter({"clone_flags", "0x800"}),
                                   Parameter({"clone_flags", "0x10000000"}, false)};
  ExpectDecisions({
      {"some bits of one rule", rules, flags("0x100"), "yes: -p clone_flags 0x300 grant"},
      {"bits of two", rules, flags("0x900"),
       "yes: -p clone_flags 0x300 grant; -p clone_flags 0x800 grant"},
      {"none", rules, flags("0"), "yes"},
      {"the signal of a child", rules, flags("17"), "yes"},
      {"one of no rule", rules, flags("0x511"), "no, missing: -p clone_flags 0x400 grant"},
      {"a revoked one", rules, flags("0x10000100"),
       "no: -p clone_flags 0x10000000 revoke -> -p clone_flags 0x10000000 grant"},
      {"not revoked, where none is granted", {rules[2]}, flags("0x100"), "yes, open"},
      {"revoked, where none is granted",
       {rules[2]},
       flags("0x10000000"),
       "no: -p clone_flags 0x10000000 revoke -> -p clone_flags 0x10000000 grant"},
      {"no rule", {}, flags("0x10000000"), "yes, open"},
  });
}

TEST(Decide, TakesSetsOfSystemCalls) {
  const auto call = [](const char* name) { return WordsQuestion{RuleKind::kSyscall, {name}}; };
  const auto rule = [](const char* word, bool grant) {
    return RuleOf(RuleKind::kSyscall, {word}, grant);
  };
  ExpectDecisions({
      {"a member", {rule("@file", true)}, call("openat"), "yes: -s @file grant"},
      {"no member", {rule("@file", true)}, call("socket"), "no, missing: -s socket grant"},
      {"a revoked member",
       {rule("@file", true), rule("openat", false)},
       call("openat"),
       "no: -s openat revoke -> -s openat grant"},
      {"a revoked set",
       {rule("@file", false), rule("openat", true)},
       call("openat"),
       "no: -s @file revoke -> -s @file grant"},
      {"two sets",
       {rule("@io", true), rule("@start", true)},
       call("read"),
       "yes: -s @io grant; -s @start grant"},
      {"the set itself", {rule("@file", true)}, call("@file"), "yes: -s @file grant"},
  });
}

TEST(Decide, TakesListingRemovingAndTruncating) {
  const std::vector<Rule> rules = {Path("/srv", "rw"), Path("/srv/ro", "r"),
                                   Object({"log", "remove"}, false), Object({"log", "truncate"})};
  ExpectDecisions({
      {"listing is reading", rules, File(FileAccess::kList, "/srv/ro"), "yes: -r /srv/ro r"},
      {"removing is writing", rules, File(FileAccess::kRemove, "/srv/a"), "yes: -r /srv rw"},
      {"also of the narrower path itself", rules, File(FileAccess::kRemove, "/srv/ro"),
       "no: -r /srv/ro r -> -r /srv/ro rw"},
      {"truncating is writing", rules, File(FileAccess::kTruncate, "/srv/ro/a"),
       "no: -r /srv/ro r -> -r /srv/ro rw"},
      {"a label's rule", rules, File(FileAccess::kTruncate, "/var/a", "log"),
       "yes: -a log truncate grant"},
      {"which refuses", rules, File(FileAccess::kRemove, "/srv/a", "log"),
       "no: -a log remove revoke -> -a log remove grant"},
      {"neither", rules, File(FileAccess::kList, "/var/a", "log"),
       "no, missing: -r /var/a r; -a log list grant"},
  });
}

TEST(Decide, TakesTheMakingOfFiles) {
  const std::vector<Rule> rules = {
      Path("/srv", "rw"),
      Path("/srv/ro", "r"),
      RuleOf(RuleKind::kFileCreation, {"spool", "mail", "regular"}, true),
      RuleOf(RuleKind::kFileCreation, {"spool", "log", "regular"}, false),
      RuleOf(RuleKind::kFileCreation, {"spool", "mail", "symlink"}, false),
      RuleOf(RuleKind::kFileCreation, {"spool", "mail", "char_device"}, true),
      RuleOf(RuleKind::kUnixSocketCreation, {"spool", "stream"}, true),
  };
  const auto socket = [](const char* what, const char* path) {
    CreationQuestion question = Creation(what, path, "spool");
    question.kind = RuleKind::kUnixSocketCreation;
    return question;
  };
  ExpectDecisions({
      {"by its own path", rules, Creation("fifo", "/srv/a"), "yes: -r /srv rw"},
      {"which is not the directory's", rules, Creation("directory", "/srv/ro"),
       "no: -r /srv/ro r -> -r /srv/ro rw"},
      {"by the label of the directory", rules, Creation("regular", "/var/a", "spool"),
       "yes: -f spool mail regular grant"},
      {"both", rules, Creation("regular", "/srv/a", "spool"),
       "yes: -r /srv rw; -f spool mail regular grant"},
      {"the path refuses", rules, Creation("regular", "/srv/ro/a", "spool"),
       "no: -r /srv/ro r -> -r /srv/ro rw"},
      {"the label refuses", rules, Creation("symlink", "/srv/a", "spool"),
       "no: -f spool mail symlink revoke -> -f spool mail symlink grant"},
      {"neither", rules, Creation("fifo", "/var/a", "spool"),
       "no, missing: -r /var/a w; -f spool spool fifo grant"},
      {"a device by its label alone", rules, Creation("char_device", "/srv/a", "spool"),
       "yes: -f spool mail char_device grant"},
      {"not by a path", rules, Creation("block_device", "/srv/a", "spool"),
       "no, missing: -f spool spool block_device grant"},
      {"nor without a label", rules, Creation("block_device", "/srv/a"),
       "no, missing: -f OBJECT NEWOBJECT block_device grant"},
      {"against a path", rules, Creation("char_device", "/srv/ro/a", "spool"),
       "no: -r /srv/ro r -> -r /srv/ro rw"},
      {"a socket", rules, socket("stream", "/var/a"), "yes: -u spool stream grant"},
      {"a socket of another kind", rules, socket("dgram", "/var/a"),
       "no, missing: -r /var/a w; -u spool dgram grant"},
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
