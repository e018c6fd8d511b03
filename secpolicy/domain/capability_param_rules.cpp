#include "secpolicy/domain/capability_param_rules.h"

#include "braxo/misc/strcat.h"
#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_CapabilityParamRule;

constexpr std::size_t kMostTokens = 4;
constexpr std::size_t kFewestTokens = 3;

void TakeParamCheck(TeskAccess_CapabilityParamRule& rule, RuleLine& line) {
  line.RequireCount(kFewestTokens, kMostTokens);
  rule.paramCheck = line.Take();
  rule.firstParam = line.Take();
  if (line.Left() > 1) rule.secondParam = line.Take();
  rule.grant = line.TakeGrant();
  line.Validate(rule.paramCheck, 1, TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK);
}

}  // namespace

void CapabilityParamRules::AddRule(unsigned int line, const std::string& domainName,
                                   unsigned int domainId, std::queue<std::string> args,
                                   TeskAccessInterfaceImpl& access) {
  AppendRule(rules, {line, domainName, domainId, args, access}, TakeParamCheck);
}

void CapabilityParamRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetCapabilityParamRule);
}

void CapabilityParamRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetCapabilityParamRules(domainId, rules);
}

void CapabilityParamRules::CheckConstraints(const std::string& domainName,
                                            TeskAccessInterfaceImpl& access) {
  try {
    access.CheckCapabilityParamRuleConstraints(domainName, rules);
  } catch (const Braxo::Lib::BraxoException& failure) {
    RaiseError(Braxo::Misc::StrCat("Policy constraint error for domain: ", domainName, " : ",
                                   failure.what()));
  }
}

void CapabilityParamRules::PrintRules() {
  PrintEach(keyword, rules, [](std::string& text, const TeskAccess_CapabilityParamRule& rule) {
    AppendWord(text, rule.paramCheck);
    AppendWord(text, rule.firstParam);
    if (!rule.secondParam.empty()) AppendWord(text, rule.secondParam);
    AppendGrant(text, rule.grant);
  });
}

}  // namespace SecPolicy
