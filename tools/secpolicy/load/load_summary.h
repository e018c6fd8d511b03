#pragma once

#include <cstddef>
#include <map>
#include <string>
#include <vector>

#include "host/linux/operation/policy_load.h"

namespace SecPolicyCli {

// "FILE: N errors", a line for each policy file and directory of a load of `policyDir`, and how to
// see the lines; nothing when there are none.
std::string DescribeProblems(const std::map<std::string, std::size_t>& problems,
                             const std::string& policyDir);

// The same of a load of the bundle `bundle`, whose files are in the directory `dir` for a moment:
// by their names in the bundle.
std::string DescribeBundleProblems(const std::map<std::string, std::size_t>& problems,
                                   const std::string& bundle, const std::string& dir);

// What the summary of a load says that stopped since there are no domains `missing`, which are one
// at least.
std::string DescribeStop(const std::vector<std::string>& missing, const std::string& policyDir);

// How much is installed now: "9 domains, 137 rules, 17 objects". Throws what the host throws.
std::string CountInstalled();

// What the summary of a load that ended well begins with. That it cannot be counted is said on
// standard error: what is done is done.
std::string DescribeDone(const std::string& verb);

// What the summary of a load that ended well goes on with: what was removed since no file has it,
// or kept. Nothing where every rule and domain is in a file.
std::string DescribeRemainder(const LinuxHost::LoadEnding& ending, bool keep);

// The same of a load that failed. It does not see what stands behind an error, so files may have
// what it has found in none.
std::string DescribeUnremoved(const LinuxHost::LoadEnding& ending);

}  // namespace SecPolicyCli
