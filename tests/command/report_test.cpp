// Hunts a report whose answers, made beforehand, are others than those of a decision, and a page
// that what it shows breaks out of.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

#include "report/answers.h"
#include "report/page.h"

namespace SecPolicyCli {
namespace {

using Policy::Decide;
using Policy::InstalledDomain;
using Policy::Permissions;
using Policy::Rule;
using Policy::RuleKind;
using ::testing::HasSubstr;
using ::testing::Not;

Rule RuleOf(RuleKind kind, const std::array<std::string, Policy::kMaxRuleWords>& words,
            const Policy::Verdict& verdict) {
  return {.kind = kind, .words = words, .verdict = verdict};
}

InstalledDomain DomainWith(std::vector<Rule> rules) {
  InstalledDomain domain;
  domain.rules = std::move(rules);
  return domain;
}

// Holds the answer to the decision of the whole domain.
void ExpectSame(const Answer& answer, const Policy::Question& question,
                const InstalledDomain& domain) {
  const Policy::Decision decision = Decide(question, domain);
  EXPECT_EQ(answer.granted, decision.granted);
  EXPECT_EQ(answer.isOpen, decision.isOpen);
  ASSERT_EQ(answer.rules.size(), decision.votes.size());
  for (std::size_t index = 0; index < answer.rules.size(); ++index) {
    EXPECT_EQ(domain.rules[answer.rules[index]].Text(), decision.votes[index].rule.Text());
  }
}

TEST(ReportAnswers, CoverAllNumbersOfACheck) {
  const InstalledDomain domain = DomainWith({
      RuleOf(RuleKind::kParameterCheck, {"bind_port", "80", "443"}, true),
      RuleOf(RuleKind::kParameterCheck, {"bind_port", "0x200", "1023"}, false),
      RuleOf(RuleKind::kParameterCheck, {"set_uid", "18446744073709551615", ""}, false),
  });
  for (const auto& [check, ranges] : AnswersOf(domain, {}).checks) {
    std::uint64_t next = 0;
    for (const RangeAnswer& range : ranges) {
      EXPECT_EQ(range.first, next);
      for (const std::uint64_t number : {range.first, range.last}) {
        ExpectSame(range.answer, Policy::ParameterQuestion{check, std::to_string(number)}, domain);
      }
      next = range.last + 1;
    }
    EXPECT_EQ(ranges.back().last, std::numeric_limits<std::uint64_t>::max());
  }
}

TEST(ReportAnswers, HaveEachBitOfAMask) {
  const InstalledDomain domain = DomainWith({
      RuleOf(RuleKind::kParameterCheck, {"clone_flags", "0x30000000", ""}, true),
      RuleOf(RuleKind::kParameterCheck, {"clone_flags", "0x40000000", ""}, false),
  });
  const std::vector<RangeAnswer> bits = AnswersOf(domain, {}).checks.at("clone_flags");
  ASSERT_EQ(bits.size(), 57U);
  for (const RangeAnswer& bit : bits) {
    const Policy::ParameterQuestion question{"clone_flags", std::to_string(bit.first)};
    ExpectSame(bit.answer, question, domain);
  }
}

TEST(ReportAnswers, KnowSetsTransitionsAndCreations) {
  const InstalledDomain domain = DomainWith({
      RuleOf(RuleKind::kObjectAccess, {"tool", "execute"}, false),
      RuleOf(RuleKind::kDomainTransition, {"tool", "webDom", "exec"}, true),
      RuleOf(RuleKind::kDomainTransition, {"data", "webDom", "enter"}, false),
      RuleOf(RuleKind::kFileCreation, {"data", "data", "regular"}, false),
      RuleOf(RuleKind::kFileCreation, {"data", "tool", "regular"}, true),
      RuleOf(RuleKind::kSyscall, {"@file", "", ""}, true),
      RuleOf(RuleKind::kSyscall, {"openat", "", ""}, false),
  });
  const DomainAnswers answers = AnswersOf(domain, {"openat", "unlink", "ptrace"});
  EXPECT_EQ(answers.calls.count("ptrace"), 0U);
  for (const auto& [call, answer] : answers.calls) {
    ExpectSame(answer, Policy::WordsQuestion{RuleKind::kSyscall, {call}}, domain);
  }
  ExpectSame(answers.entries.at("webDom"), Policy::EntryQuestion{"webDom", {}}, domain);
  const Policy::FileQuestion execution{Policy::FileAccess::kExecute, "/none", "tool"};
  ExpectSame(answers.executions.at("tool"), execution, domain);
  const Policy::CreationQuestion creation{RuleKind::kFileCreation, "regular", "/none", "data"};
  ExpectSame(answers.creations.at({"data", "regular"}), creation, domain);
}

TEST(ReportAnswers, TellWhatAPathPermits) {
  const InstalledDomain domain = DomainWith({
      RuleOf(RuleKind::kFilePath, {"/srv"}, Permissions::Parse("rx")),
      RuleOf(RuleKind::kFilePath, {"/srv/log"}, Permissions::Parse("w")),
      RuleOf(RuleKind::kCapability, {"cap_kill"}, false),
      RuleOf(RuleKind::kCapability, {"cap_chown"}, true),
  });
  const std::vector<unsigned int> expected = {0b0001101, kMakes | 0b0110010, 0, 1};
  EXPECT_EQ(AnswersOf(domain, {}).ofRules, expected);
}

TEST(ReportAnswers, SettlePathsWithLabels) {
  const Policy::FileQuestion read;
  EXPECT_TRUE(Settle(read, Say::kGrants, Say::kNothing).granted);
  EXPECT_TRUE(Settle(read, Say::kGrants, Say::kGrants).byLabel);
  const Settled refused = Settle(read, Say::kGrants, Say::kRefuses);
  EXPECT_FALSE(refused.granted);
  EXPECT_FALSE(refused.byPath);
  EXPECT_TRUE(refused.byLabel);
  EXPECT_FALSE(Settle(read, Say::kNothing, Say::kNothing).granted);

  const Policy::CreationQuestion device{RuleKind::kFileCreation, "char_device", {}, {}};
  EXPECT_FALSE(Settle(device, Say::kGrants, Say::kNothing).granted);
  EXPECT_TRUE(Settle(device, Say::kNothing, Say::kGrants).granted);
}

TEST(ReportPage, IsNotBrokenOutOf) {
  const std::string page = MakePage("</title><b>&\"", {{"name", "</script><!--{{title}}"}});
  EXPECT_THAT(page, HasSubstr("<title>&lt;/title&gt;&lt;b&gt;&amp;&quot;</title>"));
  EXPECT_THAT(page, HasSubstr(R"({"name": "\u003c/script>\u003c!--{{title}}"}</script>)"));
  EXPECT_THAT(page, Not(HasSubstr("{{style")));
  EXPECT_THAT(page, Not(HasSubstr("{{script")));
}

}  // namespace
}  // namespace SecPolicyCli
