#pragma once

#include <functional>
#include <string>

#include "host/linux/files/file_walk.h"

namespace SecPolicyCli {

using OnLabelledFile = std::function<void(const LinuxHost::WalkedFile& file)>;
using OnUnreachable = std::function<void(const std::string& path, const std::string& why)>;

// Hands the file at `path` to `visit` and, with `wholeTree`, everything below it too, in order of
// name: the files that the library labels in a tree, which are no links, no sockets and none whose
// type the directory does not tell. Otherwise as LinuxHost::WalkFiles().
void WalkLabelledFiles(const std::string& path, bool wholeTree, const OnLabelledFile& visit,
                       const OnUnreachable& fail);

}  // namespace SecPolicyCli
