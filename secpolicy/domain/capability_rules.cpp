#include "secpolicy/domain/capability_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_CapabilityRule;

constexpr std::array kCapabilityTokens = {
    RuleToken{&TeskAccess_CapabilityRule::capability,
              TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY},
};

}  // namespace

void CapabilityRules::AddRule(unsigned int line, const std::string& domainName,
                              unsigned int domainId, std::queue<std::string> args,
                              TeskAccessInterfaceImpl& access) {
  AppendRule(rules, {line, domainName, domainId, args, access}, kCapabilityTokens);
}

void CapabilityRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetCapabilityRule);
}

void CapabilityRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetCapabilityRules(domainId, rules);
}

void CapabilityRules::PrintRules() { PrintEach(keyword, rules, kCapabilityTokens); }

}  // namespace SecPolicy
