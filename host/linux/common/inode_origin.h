#pragma once

#include <sys/stat.h>
#include <sys/types.h>

#include <cstdint>
#include <optional>
#include <string>

namespace LinuxHost {

// Which tardisk an inode came from. Inode numbers are used again, so the file's path and time of
// birth tell whether the inode is still the one that was unpacked.
struct InodeOrigin {
  dev_t device = 0;
  ino_t inode = 0;
  std::string tardisk;     // the bare file name of the tardisk
  std::string path;        // absolute
  std::int64_t birth = 0;  // nanoseconds since 1970; 0 on file systems that do not keep it
  // What an edit changes, as they were when it was unpacked.
  std::uint64_t size = 0;
  std::int64_t modified = 0;  // nanoseconds since 1970
  // Of a regular file, by which the kernel tells it from one that has its number later.
  std::optional<std::uint32_t> generation = {};
};

// Fills `*status` with what statx(2) tells about `path`; a link in last place is not followed.
// Returns false with errno set when there is no such file.
bool Examine(const char* path, struct statx* status);

// The device, the time of birth and that of the last change that `status` holds, in the units of
// InodeOrigin.
dev_t DeviceOf(const struct statx& status);
std::int64_t BirthOf(const struct statx& status);
std::int64_t ModifiedOf(const struct statx& status);

}  // namespace LinuxHost
