#include "secpolicy/domain/object_access_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_ObjectAccessRule;

constexpr std::array kObjectAccessTokens = {
    RuleToken{&TeskAccess_ObjectAccessRule::label, TeskCtl::Security::TESKACCESS_KEYWORD_LABEL},
    RuleToken{&TeskAccess_ObjectAccessRule::accessKind,
              TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS},
};

}  // namespace

void ObjectAccessRules::AddRule(unsigned int line, const std::string& domainName,
                                unsigned int domainId, std::queue<std::string> args,
                                TeskAccessInterfaceImpl& access) {
  AppendRule(rules, {line, domainName, domainId, args, access}, kObjectAccessTokens);
}

void ObjectAccessRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetObjectAccessRule);
}

void ObjectAccessRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetObjectAccessRules(domainId, rules);
}

void ObjectAccessRules::PrintRules() { PrintEach(keyword, rules, kObjectAccessTokens); }

}  // namespace SecPolicy
