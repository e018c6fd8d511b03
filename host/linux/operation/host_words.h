#pragma once

#include <map>
#include <string>

#include "teskctl/security.h"

namespace LinuxHost {

// The words of a table and their identifiers, where there need be no state; none for labels, which
// policies declare. Throws HostError for a type that is no table.
std::map<std::string, long> HostWords(TeskCtl::Security::TeskAccess_KeywordType type);

}  // namespace LinuxHost
