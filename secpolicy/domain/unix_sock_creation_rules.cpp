#include "secpolicy/domain/unix_sock_creation_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_UnixSockCreationRule;

constexpr std::array kTokens = {
    RuleToken{&TeskAccess_UnixSockCreationRule::label, TeskCtl::Security::TESKACCESS_KEYWORD_LABEL},
    RuleToken{&TeskAccess_UnixSockCreationRule::sockKind,
              TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION},
};

}  // namespace

void UnixSockCreationRules::AddLine(RuleLine& line, TeskAccessInterfaceImpl& access) {
  AppendRule(rules, line, [&](TeskAccess_UnixSockCreationRule& rule) {
    TakeTokens(rule, kTokens, line, access);
  });
}

void UnixSockCreationRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetUnixSockCreationRule);
}

void UnixSockCreationRules::ReadSystemRules(unsigned int domainId,
                                            TeskAccessInterfaceImpl& access) {
  access.GetUnixSockCreationRules(domainId, rules);
}

void UnixSockCreationRules::CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) {}

void UnixSockCreationRules::PrintRules() {
  PrintEach(keyword, rules, [](std::string& text, const TeskAccess_UnixSockCreationRule& rule) {
    AppendTokens(text, rule, kTokens);
  });
}

}  // namespace SecPolicy
