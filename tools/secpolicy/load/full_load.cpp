#include "load/full_load.h"

#include "secpolicy/observed/loading.h"

namespace SecPolicyCli {

LoadRequest FullLoad(const std::string& dir) {
  return {.verb = "load",
          .policyDir = dir,
          .steps = {{LinuxHost::LoadKind::kFull, dir, SecPolicy::LoadPolicy}},
          .mend = {},
          .prepare = {},
          .begin = {}};
}

std::vector<LoadStep> OwnLoad(const std::string& dir) {
  return {
      {.kind = LinuxHost::LoadKind::kFull,
       .directory = dir,
       .load = SecPolicy::LoadPolicyWithPartners,
       .partnersDirectory = dir + "/" + SecPolicy::kDomainsDir + "/" + SecPolicy::kPartnersDir}};
}

}  // namespace SecPolicyCli
