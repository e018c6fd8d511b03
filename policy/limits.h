#pragma once

#include <cstddef>

#include "teskctl/security.h"

// Limits that every host has.
namespace Policy {

// Of a line of a policy file, in bytes. A longer one is cut there and ends its file.
inline constexpr std::size_t kLongestLine = 1023;

// Of the name of a domain, in bytes.
inline constexpr std::size_t kLongestDomainName = 63;

// Of the path of a file policy, in bytes: with the zero behind it, it fills the record.
inline constexpr std::size_t kLongestPolicyPath =
    sizeof(TeskCtl::Security::TeskAccess_FileRule::path) - 1;

// The runtime interface names the capabilities before this number. A policy file names all.
inline constexpr unsigned int kRuntimeCapabilities = 19;

}  // namespace Policy
