#pragma once

#include <sys/types.h>

#include <cstdint>
#include <vector>

namespace Enforce {

// A regular file that came from a tardisk.
struct TardiskFile {
  dev_t device = 0;
  ino_t inode = 0;
  std::uint32_t generation = 0;  // of the inode, by which one with the same number is another
  std::uint32_t label = 0;       // the number of the tardisk's
};

using TardiskFiles = std::vector<TardiskFile>;

}  // namespace Enforce
