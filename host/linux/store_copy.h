#pragma once

#include <string>

namespace LinuxHost {

// Copies the database at `from`, which is only read and may be in use, to a new file `to`. Returns
// why it could not; empty when it could. The copy survives no power loss.
std::string CopyDatabase(const std::string& from, const std::string& to);

}  // namespace LinuxHost
