#include "policy/rule_kind.h"

#include <algorithm>

namespace Policy {
namespace {

using enum WordKind;
using enum TeskCtl::Security::TeskAccess_KeywordType;

constexpr std::array<WordForm, 11> kWordForms = {{
    {kLabel, "label", "object", TESKACCESS_KEYWORD_LABEL},
    {kDomain, "domain", "domain", std::nullopt},
    {kObjectAccess, "object access kind", "kind of access", TESKACCESS_KEYWORD_OBJECT_ACCESS},
    {kCapability, "capability", "capability", TESKACCESS_KEYWORD_CAPABILITY},
    {kTransition, "domain transition kind", "kind of transition", TESKACCESS_KEYWORD_DOM_TRANS},
    {kFileKind, "file creation kind", "kind of file", TESKACCESS_KEYWORD_FILE_CREATION},
    {kParameterCheck, "parameter check", "parameter check", TESKACCESS_KEYWORD_PARAM_CHECK},
    {kSyscall, "system call", "system call", TESKACCESS_KEYWORD_SYSCALL},
    {kSocketKind, "unix socket creation kind", "kind of socket",
     TESKACCESS_KEYWORD_UNIX_SOCK_CREATION},
    {kPath, "path", "path", std::nullopt},
    {kNumber, "number", "number", std::nullopt},
}};

}  // namespace

constexpr std::array<RuleForm, 8> kRuleForms = {{
    {.kind = RuleKind::kObjectAccess,
     .keyword = "-a",
     .name = "object access",
     .usage = "-a LABEL ACCESS grant",
     .words = {kLabel, kObjectAccess}},
    {.kind = RuleKind::kCapability,
     .keyword = "-c",
     .name = "capability",
     .usage = "-c CAPABILITY grant",
     .words = {kCapability},
     .listTitle = "capabilities"},
    {.kind = RuleKind::kDomainTransition,
     .keyword = "-d",
     .name = "domain transition",
     .usage = "-d LABEL DOMAIN KIND grant",
     .words = {kLabel, kDomain, kTransition}},
    {.kind = RuleKind::kFileCreation,
     .keyword = "-f",
     .name = "file creation",
     .usage = "-f LABEL NEWLABEL KIND grant",
     .words = {kLabel, kLabel, kFileKind},
     .listTitle = "files it may create"},
    {.kind = RuleKind::kParameterCheck,
     .keyword = "-p",
     .name = "parameter check",
     .usage = "-p CHECK FIRST [SECOND] grant",
     .words = {kParameterCheck, kNumber, kNumber},
     .optionalWords = 1,
     .listTitle = "parameter checks"},
    {.kind = RuleKind::kFilePath,
     .keyword = "-r",
     .name = "file path",
     .usage = "-r PATH [PERMISSIONS]",
     .words = {kPath},
     .endsInGrant = false},
    {.kind = RuleKind::kSyscall,
     .keyword = "-s",
     .name = "system call",
     .usage = "-s SYSCALL grant",
     .words = {kSyscall},
     .listTitle = "system calls"},
    {.kind = RuleKind::kUnixSocketCreation,
     .keyword = "-u",
     .name = "unix socket creation",
     .usage = "-u LABEL KIND grant",
     .words = {kLabel, kSocketKind},
     .listTitle = "unix sockets"},
}};

const WordForm& FormOf(WordKind kind) { return kWordForms.at(static_cast<std::size_t>(kind)); }

const WordForm* FindWordForm(TeskCtl::Security::TeskAccess_KeywordType table) {
  const auto form = std::ranges::find(kWordForms, std::optional(table), &WordForm::table);
  return form == kWordForms.end() ? nullptr : &*form;
}

const RuleForm* FindRuleForm(std::string_view keyword) {
  const auto form = std::ranges::find(kRuleForms, keyword, &RuleForm::keyword);
  return form == kRuleForms.end() ? nullptr : &*form;
}

}  // namespace Policy
