#include "secpolicy/tardisk/tardisk_exception_rules.h"

#include "braxo/misc/strcat.h"
#include "secpolicy/report.h"

namespace SecPolicy {
namespace {

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

// A tardisk with this label launches nothing.
constexpr char kUnlabeled[] = "unlabeled";

unsigned int DomainId(const std::string& name, TeskAccessInterfaceImpl& access) {
  unsigned int id = 0;
  if (!access.FindDomain(name, &id)) RaiseError("Failed to fetch domain id for " + name);
  return id;
}

void SetLabel(const TeskAccess_TardiskExceptionRule& rule, TeskAccessInterfaceImpl& access) {
  SetFileLabel(rule.tardiskPath, rule.label, access);
}

void SetTransitions(const TeskAccess_TardiskExceptionRule& rule, TeskAccessInterfaceImpl& access) {
  if (rule.label == kUnlabeled) return;
  const std::vector<std::string> launchDomains = access.GetTardiskLaunchDomains();
  for (const std::string& launchDomain : launchDomains) {
    const std::string eventKeyword = access.GetTardiskExecEventKeyword();
    const unsigned int launchDomainId = DomainId(launchDomain, access);
    if (launchDomainId == rule.domainId) continue;
    access.SetDomTransRule({.line = rule.lineNumber,
                            .domainId = launchDomainId,
                            .domainName = launchDomain,
                            .label = rule.label,
                            .targetDomain = rule.domainName,
                            .targetDomainId = rule.domainId,
                            .transitionKind = eventKeyword,
                            .grant = true});
  }
}

// Runs `set` on every rule; the first failure is thrown on with the rule's place and tardisk.
template <class SetRule>
void SetEachRule(const std::list<TeskAccess_TardiskExceptionRule>& rules,
                 TeskAccessInterfaceImpl& access, SetRule set) {
  for (const TeskAccess_TardiskExceptionRule& rule : rules) {
    try {
      set(rule, access);
    } catch (const BraxoException& failure) {
      RaiseError(StrCat(rule.policyFile, ":", rule.lineNumber, " : Tardisk: ", rule.tardiskPath,
                        " : ", failure.what()));
    }
  }
}

}  // namespace

void TardiskExceptionRules::AddRule(unsigned int lineNumber, const std::string& tardiskPath,
                                    const std::string& policyFile, std::queue<std::string> tokens,
                                    TeskAccessInterfaceImpl& access) {
  // This one failure is meant to name neither file nor line.
  if (!rules.empty()) RaiseError("Only one rule of this type is allowed");
  try {
    if (tokens.size() != 2) RuleSizeError();
    const std::string& label = tokens.front();
    const std::string& domainName = tokens.back();
    rules.push_back({.lineNumber = lineNumber,
                     .tardiskPath = tardiskPath,
                     .label = label,
                     .domainName = domainName,
                     .domainId = DomainId(domainName, access),
                     .policyFile = policyFile});
  } catch (const BraxoException& failure) {
    RaiseTardiskParseError(policyFile, lineNumber, failure.what());
  }
}

void TardiskExceptionRules::Set(TeskAccessInterfaceImpl& access) {
  SetEachRule(rules, access, SetLabel);
  SetEachRule(rules, access, SetTransitions);
}

}  // namespace SecPolicy
