#pragma once

#include <set>
#include <string>

namespace LinuxHost {

// What tardisks may bring beside files of their own.
struct TardiskRules {
  std::string policyRoot;  // the policy of the host: no tardisk's but for its tardisks/
  std::set<std::string> policyTardisks;  // the names of those that may bring it all the same
};

}  // namespace LinuxHost
