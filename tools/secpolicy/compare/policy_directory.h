#pragma once

#include <map>
#include <string>
#include <vector>

#include "host/linux/operation/rule_origins.h"
#include "installed/installed_policy.h"
#include "secpolicy/observed/policy_observer.h"

namespace SecPolicyCli {

// What the files of a policy directory say.
struct WrittenPolicy {
  Policy::InstalledPolicy policy;                  // as they would install it on an empty host
  std::map<std::string, std::string> labels;       // by what is labelled: "/etc/fstab", "/srv/*"
  std::vector<LinuxHost::LabelOrigin> labelLines;  // the same as they are written, in their order
  bool isClean = true;                             // false: a line was refused, and left out
};

// Where the partner domains of the policy directory `dir` lie.
std::string PartnerDirOf(const std::string& dir);

// Reads the objects, the domains of early boot, the domains and the file labels of `dir`, and the
// partner domains of `partnerDir`; there may be none of early boot and of partners. Works on a
// scratch state. What is refused is reported, as a load does, and told to `observer`. Throws what
// the host throws.
WrittenPolicy ReadPolicyDirectory(const std::string& dir, const std::string& partnerDir,
                                  SecPolicy::PolicyObserver& observer);

}  // namespace SecPolicyCli
