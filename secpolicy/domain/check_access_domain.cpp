#include "secpolicy/domain/check_access_domain.h"

#include <memory>

#include "teskctl/adv.h"

namespace SecPolicy {
namespace {

using Braxo::Adv::AdvancedIntegerOption;
using Braxo::Adv::AdvancedOption;

constexpr char kTemplateDomain[] = "checkAccessTemplateDom";

void AllowWholeFileTree(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  TeskCtl::Security::TeskAccess_FilePathAccessRule rule;
  rule.domainId = domainId;
  rule.path = "/";
  std::list<TeskCtl::Security::TeskAccess_FilePathAccessRule> rules = {rule};
  access.SetFilePathAccessRules(rules);
}

void CreateTemplateDomain(TeskAccessInterfaceImpl& access) {
  unsigned int id = 0;
  if (access.FindDomain(kTemplateDomain, &id)) return;
  access.CreateDomain(kTemplateDomain, TeskCtl::Security::TESKACCESS_DEFAULT_DOM_CHECK_ACCESS);
  if (!access.FindDomain(kTemplateDomain, &id)) return;
  AllowWholeFileTree(id, access);
}

}  // namespace

void CreateCheckAccessPolicyDomain(TeskAccessInterfaceImpl& access) {
  const std::unique_ptr<AdvancedOption> option(
      TeskCtl::Adv::AdvancedOptionImpl::FindOption("/UserVars/CheckAccessTemplateEnabled"));
  const auto* enabled = dynamic_cast<const AdvancedIntegerOption*>(option.get());
  if (enabled == nullptr || enabled->GetValue() == 0) return;
  CreateTemplateDomain(access);
}

}  // namespace SecPolicy
