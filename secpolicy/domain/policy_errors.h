#pragma once

#include <optional>
#include <string>

#include "secpolicy/observed/policy_observer.h"

namespace SecPolicy {

// Throws LineFailure for a policy line of the domain `domainName` that cannot be read; `fault` and
// `word` say what is wrong with it.
[[noreturn]] void RaisePolicyParseError(unsigned int line, const std::string& domainName,
                                        const std::string& message, std::optional<Fault> fault = {},
                                        std::size_t word = Problem::kWholeLine);

// Throws LineFailure for a rule of the domain `domainName` that the kernel refused.
[[noreturn]] void RaisePolicySetError(unsigned int line, const std::string& domainName,
                                      const std::string& message);

}  // namespace SecPolicy
