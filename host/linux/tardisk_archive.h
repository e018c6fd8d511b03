#pragma once

#include <sys/stat.h>

#include <functional>
#include <string>

namespace LinuxHost {

// Takes what an archive has brought: its path below the working directory, and what statx(2) tells
// about it. Returns 0, or the error number for which the unpacking ends.
using Arrival = std::function<int(const std::string& path, const struct statx& status)>;

// Unpacks the archive `image` into the working directory, and calls `arrived` for each file as soon
// as it is there. Throws BraxoException at the first entry that is refused, by itself or by
// `arrived`; earlier ones are kept.
void UnpackArchive(const std::string& image, const Arrival& arrived);

}  // namespace LinuxHost
