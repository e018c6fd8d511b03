#pragma once

#include <sys/types.h>

#include <cstdint>
#include <optional>
#include <string>

// The attribute "zorvan.security" as stock Linux can hold it.
namespace LinuxHost {

// The name of the real attribute: "security.zorvan" where this process may write it, else
// "user.zorvan.security". Chosen at the first call for the life of the host state and recorded
// there; a process keeps the answer. Throws HostError when the state cannot be used.
const std::string& LabelAttribute();

// True for a file of this kind (`st_mode`) if the real attribute can be put on it: links never
// carry a label, and what is named "user." only fits regular files and directories.
bool CanCarryLabel(mode_t mode);

// Gives the file at `path`, which is not a link, the label `id` whether or not it had one. Returns
// 0, or -1 with errno set. Links on the way to the file are followed, the last one is not.
int GiveFirstLabel(const char* path, std::uint32_t id);

// The label of the file at `path`; nothing, with errno set, when it has none or it cannot be read.
// Links on the way to the file are followed, the last one is not.
std::optional<std::uint32_t> ReadLabel(const char* path);

// Gives the file at `path` the label `id` in place of the one it has. Returns 0, or -1 with errno
// set; ENODATA when it had none. Links on the way to the file are followed, the last one is not.
int ReplaceLabel(const char* path, std::uint32_t id);

}  // namespace LinuxHost
