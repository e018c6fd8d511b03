#include "secpolicy/domain/syscall_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_SyscallRule;

constexpr std::array kSyscallTokens = {
    RuleToken{&TeskAccess_SyscallRule::syscall, TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL},
};

}  // namespace

void SyscallRules::AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
                           std::queue<std::string> args, TeskAccessInterfaceImpl& access) {
  AppendRule(rules, {line, domainName, domainId, args, access}, kSyscallTokens);
}

void SyscallRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetSyscallRule);
}

void SyscallRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetSyscallRules(domainId, rules);
}

void SyscallRules::PrintRules() { PrintEach(keyword, rules, kSyscallTokens); }

}  // namespace SecPolicy
