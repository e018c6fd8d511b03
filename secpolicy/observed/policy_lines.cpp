#include "secpolicy/observed/policy_lines.h"

#include <utility>

#include "secpolicy/domain/capability_param_rules.h"
#include "secpolicy/domain/domain_policy.h"
#include "secpolicy/domain/file_path_access_rules.h"
#include "secpolicy/labels/object_policy.h"
#include "secpolicy/report.h"
#include "secpolicy/tardisk/tardisk_policy_steps.h"

namespace SecPolicy {
DomainLines::DomainLines(const std::string& name, unsigned int id)
    : policy(std::make_unique<DomainPolicy>(name, id)) {}

DomainLines::~DomainLines() = default;

void DomainLines::Read(unsigned int line, std::queue<std::string> words,
                       TeskAccessInterfaceImpl& access) {
  policy->ParseLine(line, words, access);
}

std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule>& DomainLines::ParameterRules() {
  return dynamic_cast<CapabilityParamRules&>(*policy->ruleSets.at("-p")).rules;
}

void TardiskLines::Read(unsigned int line, std::queue<std::string> words,
                        TeskAccessInterfaceImpl& access) {
  TardiskPolicySteps(policy, Nobody()).ParseLine(tardisk, line, words, access);
}

std::string ReadObjectLine(const std::string& file, unsigned int line,
                           std::queue<std::string> words) {
  ObjectPolicy policy;
  policy.ParseLine(file, line, words);
  return std::move(policy.names.front());
}

void CheckPermissions(const std::string& permissions) {
  FilePathAccessRules().GetPermission(permissions);
}

}  // namespace SecPolicy
