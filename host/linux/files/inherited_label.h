#pragma once

#include <sys/types.h>

#include <cstddef>

// A file without a label of its own has the one of the nearest labelled directory above it, on the
// same file system and mount: what an editor saved anew stays what it was.
namespace LinuxHost {

// Whether a link at the end of a path stands for the file that it leads to, or for itself.
enum class LastLink { kFollowed, kKept };

// What stands in for getxattr(2) where the file at `path` does not carry the attribute `name`: the
// value of the directory that it inherits from. ENODATA where there is none, and for a link.
ssize_t ReadInherited(const char* path, LastLink lastLink, const char* name, void* value,
                      std::size_t size);

// What stands in for setxattr(2), which would replace the attribute that the file does not carry:
// writes it where the file inherits one. ENODATA where it does not.
int ReplaceInherited(const char* path, LastLink lastLink, const char* name, const void* value,
                     std::size_t size);

}  // namespace LinuxHost
