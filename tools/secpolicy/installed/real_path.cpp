#include "real_path.h"

#include "secpolicy/secpolicy.h"
#include "zorvan/kernel.h"

namespace SecPolicyCli {

std::string RealPathOf(const std::string& path) {
  SecPolicy::TeskAccess_FileRule resolved{};
  const bool found = path.size() < sizeof resolved.path &&
                     Zorvan::Kernel::RealPath(path.c_str(), resolved.path) == 0;
  return found ? resolved.path : "";
}

}  // namespace SecPolicyCli
