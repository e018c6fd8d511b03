#include "secpolicy/domain/dom_trans_rules.h"

#include "secpolicy/domain/rule_steps.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_DomTransRule;

constexpr std::size_t kTokenCount = 4;

// The target is looked up before the rest of the line is read: a line that names an unknown domain
// says so, whatever else is wrong with it.
void TakeTransition(TeskAccess_DomTransRule& rule, std::queue<std::string>& args,
                    TeskAccessInterfaceImpl& access) {
  if (args.size() != kTokenCount) RuleSizeError();
  rule.label = TakeToken(args);
  rule.targetDomain = TakeToken(args);
  if (!access.FindDomain(rule.targetDomain, &rule.targetDomainId)) {
    RaiseError("Failed to fetch domain id for: " + rule.targetDomain);
  }
  rule.transitionKind = TakeToken(args);
  rule.grant = TakeGrant(args);
  access.ValidateKeyword(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL, rule.label);
  access.ValidateKeyword(TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS, rule.transitionKind);
}

}  // namespace

void DomTransRules::AddRule(unsigned int line, const std::string& domainName, unsigned int domainId,
                            std::queue<std::string> args, TeskAccessInterfaceImpl& access) {
  AppendRule(rules, line, domainName, domainId,
             [&](TeskAccess_DomTransRule& rule) { TakeTransition(rule, args, access); });
}

void DomTransRules::Set(TeskAccessInterfaceImpl& access) {
  SetEach(rules, access, &TeskAccessInterfaceImpl::SetDomTransRule);
}

void DomTransRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetDomTransRules(domainId, rules);
}

void DomTransRules::CheckConstraints(const std::string&, TeskAccessInterfaceImpl&) {}

void DomTransRules::PrintRules() {
  PrintEach(keyword, rules, [](std::string& text, const TeskAccess_DomTransRule& rule) {
    AppendWord(text, rule.label);
    AppendWord(text, rule.targetDomain);
    AppendWord(text, rule.transitionKind);
    AppendGrant(text, rule.grant);
  });
}

}  // namespace SecPolicy
