#pragma once

#include <functional>
#include <string>

namespace SecPolicyCli {

// A file that a walk has come to. It was no link a moment ago.
struct WalkedFile {
  const char* name;         // leads to it from the working directory of this moment
  const std::string& path;  // beginning like the path that the walk was given
};

using OnFile = std::function<void(const WalkedFile& file)>;
using OnWalkFailure = std::function<void(const std::string& path, const std::string& why)>;

// Hands the file at `path` to `visit` and, with `wholeTree`, everything below it too, in order of
// name: the files that the library labels in a tree, which are no links, no sockets and none whose
// type the directory does not tell. Links on the way to `path` are followed, those below are not.
//
// Changes the working directory while it runs: it goes step by step, with few open files in a tree
// of any depth, and a link that is planted meanwhile does not lead it astray. What cannot be
// entered is told to `fail`, and the rest visited; directories that vanish meanwhile are left out.
void WalkFiles(const std::string& path, bool wholeTree, const OnFile& visit,
               const OnWalkFailure& fail);

}  // namespace SecPolicyCli
