// The table of kinds: hunts for rows out of order and for forms that do not fit their usage.

#include "policy/rule_kind.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

#include "domain/rule_families.h"

namespace PolicyTest {
namespace {

using Policy::FindRuleForm;
using Policy::FindWordForm;
using Policy::FormOf;
using Policy::kRuleForms;
using Policy::RuleForm;
using Policy::RuleKind;
using Policy::WordKind;

TEST(RuleForm, IsFoundByKindAndByKeyword) {
  for (const RuleForm& form : kRuleForms) {
    EXPECT_EQ(&FormOf(form.kind), &form) << form.keyword;
    EXPECT_EQ(FindRuleForm(form.keyword), &form) << form.keyword;
  }
  for (const char* keyword : {"", "-", "a", "-A", "-aa", "-E"}) {
    EXPECT_EQ(FindRuleForm(keyword), nullptr) << keyword;
  }
}

TEST(RuleForm, StandsInTheOrderOfItsKeyword) {
  std::string keywords;
  std::set<std::string> names;
  for (const RuleForm& form : kRuleForms) {
    keywords += form.keyword;
    names.insert(form.name);
  }
  EXPECT_EQ(keywords, "-a-c-d-f-p-r-s-u");
  EXPECT_EQ(names.size(), kRuleForms.size());
}

// "-p CHECK FIRST [SECOND] grant" of its words.
std::size_t CountWords(const RuleForm& form, char first, char last) {
  std::size_t count = 0;
  for (auto words = SecPolicyTest::Words(form.usage); !words.empty(); words.pop()) {
    const std::string& word = words.front();
    if (word.front() >= first && word.front() <= last) ++count;
  }
  return count;
}

TEST(RuleForm, HasAWordForEachOfItsUsage) {
  for (const RuleForm& form : kRuleForms) {
    const std::string usage = form.usage;
    const std::size_t optional = form.optionalWords + (form.endsInGrant ? 0 : 1);
    EXPECT_EQ(CountWords(form, 'A', 'Z'), form.MinWords()) << usage;
    EXPECT_EQ(CountWords(form, '[', '['), optional) << usage;
    EXPECT_EQ(usage.ends_with(" grant"), form.endsInGrant) << usage;
    EXPECT_TRUE(usage.starts_with(form.keyword)) << usage;
  }
}

struct Table {
  WordKind kind;
  TeskCtl::Security::TeskAccess_KeywordType table;
  const char* noun;
};

constexpr Table kTables[] = {
    {WordKind::kLabel, TeskCtl::Security::TESKACCESS_KEYWORD_LABEL, "label"},
    {WordKind::kCapability, TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY, "capability"},
    {WordKind::kParameterCheck, TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK,
     "parameter check"},
    {WordKind::kObjectAccess, TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS,
     "object access kind"},
    {WordKind::kTransition, TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS,
     "domain transition kind"},
    {WordKind::kFileKind, TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION,
     "file creation kind"},
    {WordKind::kSocketKind, TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION,
     "unix socket creation kind"},
    {WordKind::kSyscall, TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL, "system call"},
};

TEST(WordForm, IsFoundByKindAndByTable) {
  for (const auto& [kind, table, noun] : kTables) {
    EXPECT_EQ(FormOf(kind).kind, kind) << noun;
    EXPECT_EQ(FindWordForm(table), &FormOf(kind)) << noun;
    EXPECT_STREQ(FormOf(kind).noun, noun);
  }
  for (const WordKind kind : {WordKind::kDomain, WordKind::kPath, WordKind::kNumber}) {
    EXPECT_EQ(FormOf(kind).kind, kind) << FormOf(kind).noun;
    EXPECT_EQ(FormOf(kind).table, std::nullopt) << FormOf(kind).noun;
  }
  EXPECT_EQ(FindWordForm(TeskCtl::Security::TeskAccess_KeywordType{0}), nullptr);
  EXPECT_EQ(FindWordForm(TeskCtl::Security::TeskAccess_KeywordType{9}), nullptr);
}

}  // namespace
}  // namespace PolicyTest
