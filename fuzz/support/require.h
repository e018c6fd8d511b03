#pragma once

#include <string>

namespace SecPolicyFuzz {

// Ends the process with `message` on standard error unless `holds`: what a fuzzer reports as a
// finding.
void Require(bool holds, const std::string& message);

// The same for two texts that have to be equal; shows both.
void RequireEqual(const std::string& actual, const std::string& expected,
                  const std::string& message);

}  // namespace SecPolicyFuzz
