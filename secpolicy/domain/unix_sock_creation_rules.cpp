#include "secpolicy/domain/unix_sock_creation_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_UnixSockCreationRule;

constexpr std::array kUnixSockTokens = {
    RuleToken{&TeskAccess_UnixSockCreationRule::label, TeskCtl::Security::TESKACCESS_KEYWORD_LABEL},
    RuleToken{&TeskAccess_UnixSockCreationRule::sockKind,
              TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION},
};

}  // namespace

void UnixSockCreationRules::AddRule(unsigned int line, const std::string& domainName,
                                    unsigned int domainId, std::queue<std::string> args,
                                    TeskAccessInterfaceImpl& access) {
  AppendRule(rules, {line, domainName, domainId, args, access}, kUnixSockTokens);
}

void UnixSockCreationRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetUnixSockCreationRule);
}

void UnixSockCreationRules::ReadSystemRules(unsigned int domainId,
                                            TeskAccessInterfaceImpl& access) {
  access.GetUnixSockCreationRules(domainId, rules);
}

void UnixSockCreationRules::PrintRules() { PrintEach(keyword, rules, kUnixSockTokens); }

}  // namespace SecPolicy
