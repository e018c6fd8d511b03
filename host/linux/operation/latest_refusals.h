#pragma once

#include <optional>
#include <string>

// What the module has refused of late, as who reads it from the kernel has written it down: in the
// file `refusals` beside the state. It names files of all users, so only its writer and the
// superuser read it.
namespace LinuxHost {

// The path of the file.
std::string LatestRefusalsFile();

// Replaces what is there at once. Throws HostError.
void WriteLatestRefusals(const std::string& text);

// What was written; nothing where nothing was. Throws HostError where it may not be read, or others
// may have written it.
std::optional<std::string> ReadLatestRefusals();

}  // namespace LinuxHost
