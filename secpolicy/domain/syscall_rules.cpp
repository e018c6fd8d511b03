#include "secpolicy/domain/syscall_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_SyscallRule;

constexpr std::array kTokens = {
    RuleToken{&TeskAccess_SyscallRule::syscall, TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL},
};

}  // namespace

void SyscallRules::AddLine(RuleLine& line, TeskAccessInterfaceImpl& access) {
  AppendRule(rules, line,
             [&](TeskAccess_SyscallRule& rule) { TakeTokens(rule, kTokens, line, access); });
}

void SyscallRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetSyscallRule);
}

void SyscallRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetSyscallRules(domainId, rules);
}

void SyscallRules::CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) {}

void SyscallRules::PrintRules() {
  PrintEach(keyword, rules, [](std::string& text, const TeskAccess_SyscallRule& rule) {
    AppendTokens(text, rule, kTokens);
  });
}

}  // namespace SecPolicy
