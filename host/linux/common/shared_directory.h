#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

#include "host/linux/common/descriptor.h"

// Directories beside the state that other users may look into.
namespace LinuxHost {

// The directory at `path`, of this user and with the mode `mode`; made where there is none. Lets
// others pass the directory above where that is the host's own to arrange. Throws HostError when it
// cannot be made, and for one that belongs to another user.
Descriptor MakeSharedDirectory(const std::string& path, mode_t mode);

// The names in an open directory, without "." and "..", from its beginning; those that can be read.
std::vector<std::string> NamesIn(const Descriptor& directory);

}  // namespace LinuxHost
