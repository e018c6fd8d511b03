#include "secpolicy/domain/domain_policy.h"

#include "secpolicy/carry_on.h"
#include "secpolicy/domain/capability_param_rules.h"
#include "secpolicy/domain/capability_rules.h"
#include "secpolicy/domain/dom_trans_rules.h"
#include "secpolicy/domain/file_creation_rules.h"
#include "secpolicy/domain/file_path_access_rules.h"
#include "secpolicy/domain/object_access_rules.h"
#include "secpolicy/domain/policy_errors.h"
#include "secpolicy/domain/syscall_rules.h"
#include "secpolicy/domain/unix_sock_creation_rules.h"
#include "secpolicy/report.h"

namespace SecPolicy {

template <class Rules>
void DomainPolicy::AddRuleSet(const char* keyword) {
  auto rules = std::make_unique<Rules>();
  rules->keyword = keyword;
  ruleSets.emplace(keyword, std::move(rules));
}

DomainPolicy::DomainPolicy(const std::string& domainName, unsigned int domainId)
    : id(domainId), name(domainName) {
  AddRuleSet<SyscallRules>("-s");
  AddRuleSet<CapabilityRules>("-c");
  AddRuleSet<CapabilityParamRules>("-p");
  AddRuleSet<ObjectAccessRules>("-a");
  AddRuleSet<DomTransRules>("-d");
  AddRuleSet<FileCreationRules>("-f");
  AddRuleSet<UnixSockCreationRules>("-u");
  AddRuleSet<FilePathAccessRules>("-r");
}

void DomainPolicy::ParsePolicy(TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  if (policyFile.empty()) RaiseError("Policy file path has not been set for domain " + name);

  TellFailure(policyFile, observer, [&] {
    std::map<unsigned int, std::queue<std::string>> parsed;
    ParseFile(policyFile, parsed);
    ProcessParsedPolicyFile(access, parsed);
  });
}

void DomainPolicy::ProcessParsedPolicyFile(
    TeskAccessInterfaceImpl& access, std::map<unsigned int, std::queue<std::string>>& parsed) {
  for (auto& [line, tokens] : parsed) {
    if (!tokens.empty()) ParseLine(line, tokens, access);
  }
}

void DomainPolicy::ParseLine(unsigned int line, std::queue<std::string>& tokens,
                             TeskAccessInterfaceImpl& access) {
  const std::string keyword = std::move(tokens.front());
  tokens.pop();
  const auto rules = ruleSets.find(keyword);
  if (rules == ruleSets.end()) {
    RaisePolicyParseError(line, name, "invalid policy rule type (" + keyword + ")",
                          Fault::kRuleType, 0);
  }
  rules->second->AddRule(line, name, id, tokens, access);
}

void DomainPolicy::CheckPolicyConstraints(TeskAccessInterfaceImpl& access) {
  for (const auto& [keyword, rules] : ruleSets) rules->CheckConstraints(name, access);
}

void DomainPolicy::SetPolicy(TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  if (hasErrors) {
    RaiseError("Skipping the policy for domain " + name + " due to errors in the policy");
  }
  TellFailure(policyFile, observer, [&] {
    for (const auto& [keyword, rules] : ruleSets) {
      if (auto* const paths = dynamic_cast<FilePathAccessRules*>(rules.get())) {
        paths->SetObserved(observer);
      } else {
        rules->Set(access);
      }
    }
  });
}

void DomainPolicy::ReadSystemPolicy(TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  ForEachCarryOn(ruleSets, observer,
                 [&](auto& entry) { entry.second->ReadSystemRules(id, access); });
}

void DomainPolicy::PrintPolicy() {
  for (const auto& [keyword, rules] : ruleSets) rules->PrintRules();
  PrintLine();
}

}  // namespace SecPolicy
