#include "secpolicy/domain/object_access_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_ObjectAccessRule;

constexpr std::array kTokens = {
    RuleToken{&TeskAccess_ObjectAccessRule::label, TeskCtl::Security::TESKACCESS_KEYWORD_LABEL},
    RuleToken{&TeskAccess_ObjectAccessRule::accessKind,
              TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS},
};

}  // namespace

void ObjectAccessRules::AddLine(RuleLine& line, TeskAccessInterfaceImpl& access) {
  AppendRule(rules, line,
             [&](TeskAccess_ObjectAccessRule& rule) { TakeTokens(rule, kTokens, line, access); });
}

void ObjectAccessRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetObjectAccessRule);
}

void ObjectAccessRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetObjectAccessRules(domainId, rules);
}

void ObjectAccessRules::CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) {}

void ObjectAccessRules::PrintRules() {
  PrintEach(keyword, rules, [](std::string& text, const TeskAccess_ObjectAccessRule& rule) {
    AppendTokens(text, rule, kTokens);
  });
}

}  // namespace SecPolicy
