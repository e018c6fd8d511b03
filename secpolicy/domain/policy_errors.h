#pragma once

#include <string>

namespace SecPolicy {

// Throws Braxo::Lib::BraxoException for a policy line of the domain `domainName` that cannot be
// read.
[[noreturn]] void RaisePolicyParseError(unsigned int line, const std::string& domainName,
                                        const std::string& message);

// Throws Braxo::Lib::BraxoException for a rule of the domain `domainName` that the kernel refused.
[[noreturn]] void RaisePolicySetError(unsigned int line, const std::string& domainName,
                                      const std::string& message);

}  // namespace SecPolicy
