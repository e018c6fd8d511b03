#include "host/linux/common/inode_origin.h"

#include <fcntl.h>
#include <sys/sysmacros.h>

namespace LinuxHost {
namespace {

std::int64_t Nanoseconds(const struct statx_timestamp& time) {
  return time.tv_sec * 1'000'000'000 + time.tv_nsec;
}

}  // namespace

bool Examine(const char* path, struct statx* status) {
  return statx(AT_FDCWD, path, AT_SYMLINK_NOFOLLOW, STATX_BASIC_STATS | STATX_BTIME, status) == 0;
}

dev_t DeviceOf(const struct statx& status) {
  return makedev(status.stx_dev_major, status.stx_dev_minor);
}

std::int64_t BirthOf(const struct statx& status) {
  if ((status.stx_mask & STATX_BTIME) == 0) return 0;
  return Nanoseconds(status.stx_btime);
}

std::int64_t ModifiedOf(const struct statx& status) { return Nanoseconds(status.stx_mtime); }

}  // namespace LinuxHost
