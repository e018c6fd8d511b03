#include "secpolicy/domain/capability_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_CapabilityRule;

constexpr std::array kTokens = {
    RuleToken{&TeskAccess_CapabilityRule::capability,
              TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY},
};

}  // namespace

void CapabilityRules::AddLine(RuleLine& line, TeskAccessInterfaceImpl& access) {
  AppendRule(rules, line,
             [&](TeskAccess_CapabilityRule& rule) { TakeTokens(rule, kTokens, line, access); });
}

void CapabilityRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetCapabilityRule);
}

void CapabilityRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetCapabilityRules(domainId, rules);
}

void CapabilityRules::CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) {}

void CapabilityRules::PrintRules() {
  PrintEach(keyword, rules, [](std::string& text, const TeskAccess_CapabilityRule& rule) {
    AppendTokens(text, rule, kTokens);
  });
}

}  // namespace SecPolicy
