#include "secpolicy/tardisk/tardisk_exception_rules.h"

#include <utility>

#include "braxo/misc/strcat.h"

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

void SetLabel(const TeskAccess_TardiskExceptionRule& rule, TeskAccessInterfaceImpl& access,
              PolicyObserver& observer) {
  SetFileLabel(rule.tardiskPath, rule.label, access);
  observer.OnFileLabel({.path = rule.tardiskPath,
                        .label = rule.label,
                        .policyFile = rule.policyFile,
                        .lineNumber = rule.lineNumber});
}

void SetTransitions(const TeskAccess_TardiskExceptionRule& rule, TeskAccessInterfaceImpl& access,
                    PolicyObserver& observer) {
  if (rule.label == kUnlabeled) return;
  const std::vector<std::string> launchDomains = access.GetTardiskLaunchDomains();
  for (const std::string& launchDomain : launchDomains) {
    const std::string eventKeyword = access.GetTardiskExecEventKeyword();
    const unsigned int launchDomainId = DomainId(launchDomain, access);
    if (launchDomainId == rule.domainId) continue;
    const TeskCtl::Security::TeskAccess_DomTransRule transition = {.line = rule.lineNumber,
                                                                   .domainId = launchDomainId,
                                                                   .domainName = launchDomain,
                                                                   .label = rule.label,
                                                                   .targetDomain = rule.domainName,
                                                                   .targetDomainId = rule.domainId,
                                                                   .transitionKind = eventKeyword,
                                                                   .grant = true};
    access.SetDomTransRule(transition);
    observer.OnTardiskTransition(transition, rule.policyFile);
  }
}

// Runs `set` on every rule; the first failure is thrown on with the rule's place and tardisk.
template <class SetRule>
void SetEachRule(const std::list<TeskAccess_TardiskExceptionRule>& rules,
                 TeskAccessInterfaceImpl& access, PolicyObserver& observer, SetRule set) {
  for (const TeskAccess_TardiskExceptionRule& rule : rules) {
    try {
      set(rule, access, observer);
    } catch (const BraxoException& failure) {
      throw LineFailure(StrCat(rule.policyFile, ":", rule.lineNumber,
                               " : Tardisk: ", rule.tardiskPath, " : ", failure.what()),
                        {.line = rule.lineNumber, .reason = failure.what()});
    }
  }
}

}  // namespace

void TardiskExceptionRules::AddRule(unsigned int lineNumber, const std::string& tardiskPath,
                                    const std::string& policyFile, std::queue<std::string> tokens,
                                    TeskAccessInterfaceImpl& access) {
  Problem problem{.line = lineNumber, .fault = Fault::kArgumentCount};
  if (!rules.empty()) {
    problem.fault = Fault::kSecondRule;
    problem.reason = "Only one rule of this type is allowed";
    // This one failure is meant to name neither file nor line.
    throw LineFailure(problem.reason, problem);
  }
  try {
    if (tokens.size() != 2) RuleSizeError();
    problem.fault = Fault::kUnknownDomain;
    problem.word = 2;
    const std::string& label = tokens.front();
    const std::string& domainName = tokens.back();
    rules.push_back({.lineNumber = lineNumber,
                     .tardiskPath = tardiskPath,
                     .label = label,
                     .domainName = domainName,
                     .domainId = DomainId(domainName, access),
                     .policyFile = policyFile});
  } catch (const BraxoException& failure) {
    problem.reason = failure.what();
    RaiseTardiskParseError(policyFile, problem);
  }
}

void TardiskExceptionRules::SetObserved(TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  SetEachRule(rules, access, observer, SetLabel);
  SetEachRule(rules, access, observer, SetTransitions);
}

}  // namespace SecPolicy
