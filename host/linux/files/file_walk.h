#pragma once

#include <cerrno>
#include <cstddef>
#include <functional>
#include <string>

namespace LinuxHost {

// A file that a walk has come to.
struct WalkedFile {
  const char* name;         // leads to it from the working directory of this moment
  const std::string& path;  // for people: it begins as the walk was told
  unsigned char type;       // DT_DIR and so on, as its directory tells; DT_UNKNOWN for the start
  std::size_t depth;        // 0 for the start
};

// Returns whether the walk goes into the file, as into a directory.
using OnFile = std::function<bool(const WalkedFile& file)>;

// The error number of what cannot be entered or listed; kMoved when a directory was moved while the
// walk was in it, which ends the walk.
using OnWalkFailure = std::function<void(const std::string& path, int error)>;
inline constexpr int kMoved = EAGAIN;

// Hands the file at `start`, which messages call `path`, to `visit`, and everything below that it
// wants to go into, in order of name. Links on the way to `start` are followed, those below are
// not.
//
// Changes the working directory while it runs: it goes step by step, with few open files in a tree
// of any depth, and a link that is planted meanwhile does not lead it astray. What cannot be
// entered is told to `fail`, and the rest visited; what vanishes meanwhile is left out.
void WalkFiles(const std::string& start, const std::string& path, const OnFile& visit,
               const OnWalkFailure& fail);

}  // namespace LinuxHost
