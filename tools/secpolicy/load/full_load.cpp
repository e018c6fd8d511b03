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

}  // namespace SecPolicyCli
