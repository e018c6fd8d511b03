#include "secpolicy/domain/dom_trans_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_DomTransRule;

constexpr std::size_t kTransitionTokenCount = 4;

// The target is looked up before the rest of the line is read: a line that names an unknown domain
// says so, whatever else is wrong with it.
void TakeTransition(TeskAccess_DomTransRule& rule, RuleLine& line) {
  line.RequireCount(kTransitionTokenCount);
  rule.label = line.Take();
  rule.targetDomain = line.Take();
  rule.targetDomainId = line.FindDomain(rule.targetDomain);
  rule.transitionKind = line.Take();
  rule.grant = line.TakeGrant();
  line.Validate(rule.label, 1, TeskCtl::Security::TESKACCESS_KEYWORD_LABEL);
  line.Validate(rule.transitionKind, 3, TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS);
}

}  // namespace

void DomTransRules::AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
                            std::queue<std::string> args, TeskAccessInterfaceImpl& access) {
  AppendRule(rules, {line, domainName, domainId, args, access}, TakeTransition);
}

void DomTransRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetDomTransRule);
}

void DomTransRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetDomTransRules(domainId, rules);
}

void DomTransRules::PrintRules() {
  PrintEach(keyword, rules, [](std::string& text, const TeskAccess_DomTransRule& rule) {
    AppendWord(text, rule.label);
    AppendWord(text, rule.targetDomain);
    AppendWord(text, rule.transitionKind);
    AppendGrant(text, rule.grant);
  });
}

}  // namespace SecPolicy
