#include "secpolicy/domain/file_creation_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_FileCreationRule;

constexpr std::array kFileCreationTokens = {
    RuleToken{&TeskAccess_FileCreationRule::label, TeskCtl::Security::TESKACCESS_KEYWORD_LABEL},
    RuleToken{&TeskAccess_FileCreationRule::secondLabel,
              TeskCtl::Security::TESKACCESS_KEYWORD_LABEL},
    RuleToken{&TeskAccess_FileCreationRule::creationKind,
              TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION},
};

}  // namespace

void FileCreationRules::AddRule(unsigned int line, const std::string& domainName,
                                unsigned int domainId, std::queue<std::string> args,
                                TeskAccessInterfaceImpl& access) {
  AppendRule(rules, {line, domainName, domainId, args, access}, kFileCreationTokens);
}

void FileCreationRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetFileCreationRule);
}

void FileCreationRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetFileCreationRules(domainId, rules);
}

void FileCreationRules::PrintRules() { PrintEach(keyword, rules, kFileCreationTokens); }

}  // namespace SecPolicy
