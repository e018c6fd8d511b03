#pragma once

#include <cstdint>
#include <optional>

namespace LinuxHost {

// The generation of the regular file at `path`, which differs from that of any other file that has
// the number of its inode later; nothing where the file system does not tell it.
std::optional<std::uint32_t> GenerationOf(const char* path);

}  // namespace LinuxHost
