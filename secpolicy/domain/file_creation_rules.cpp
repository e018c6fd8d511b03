#include "secpolicy/domain/file_creation_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_FileCreationRule;

constexpr std::array kTokens = {
    RuleToken{&TeskAccess_FileCreationRule::label, TeskCtl::Security::TESKACCESS_KEYWORD_LABEL},
    RuleToken{&TeskAccess_FileCreationRule::secondLabel,
              TeskCtl::Security::TESKACCESS_KEYWORD_LABEL},
    RuleToken{&TeskAccess_FileCreationRule::creationKind,
              TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION},
};

}  // namespace

void FileCreationRules::AddLine(RuleLine& line, TeskAccessInterfaceImpl& access) {
  AppendRule(rules, line,
             [&](TeskAccess_FileCreationRule& rule) { TakeTokens(rule, kTokens, line, access); });
}

void FileCreationRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetFileCreationRule);
}

void FileCreationRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetFileCreationRules(domainId, rules);
}

void FileCreationRules::CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) {}

void FileCreationRules::PrintRules() {
  PrintEach(keyword, rules, [](std::string& text, const TeskAccess_FileCreationRule& rule) {
    AppendTokens(text, rule, kTokens);
  });
}

}  // namespace SecPolicy
