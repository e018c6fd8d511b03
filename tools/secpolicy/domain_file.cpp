#include "domain_file.h"

#include "secpolicy/policy_root.h"

namespace SecPolicyCli {

std::string DomainFile(std::string_view domain, const std::string& policyDir) {
  constexpr std::string_view kPrefix = SecPolicy::kPartnerPrefix;
  if (domain.starts_with(kPrefix)) {
    domain.remove_prefix(kPrefix.size());
    return SecPolicy::kPartnerDomainsDir + ("/" + std::string(domain));
  }
  return policyDir + "/" + SecPolicy::kDomainsDir + "/" + std::string(domain);
}

}  // namespace SecPolicyCli
