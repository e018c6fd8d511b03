#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "host/linux/operation/policy_load.h"

namespace SecPolicyCli {

// Writes "FILE: N errors" to standard error for each policy file and directory that `messages`, the
// errors of a load of `policyDir`, are about, and how to see the lines; nothing for those that only
// sum up. The first `earlyErrors` of them are those of the early policy.
void WriteErrorsByFile(const std::vector<std::string>& messages, std::size_t earlyErrors,
                       const std::string& policyDir);

// How much is installed now: "9 domains, 137 rules, 17 objects". Throws what the host throws.
std::string CountInstalled();

// What the summary of a load that ended well begins with. That it cannot be counted is said on
// standard error: what is done is done.
std::string DescribeDone(const std::string& verb);

// What the summary goes on with: what was removed since no file has it, and what was not. Nothing
// where every rule and domain is in a file.
std::string DescribeRemainder(const LinuxHost::LoadEnding& ending, bool keep);

}  // namespace SecPolicyCli
