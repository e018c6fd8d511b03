#pragma once

#include <string>
#include <vector>

#include "inode_origin.h"

namespace LinuxHost {

// A root file system as a boot put it together: what a policy starts on.
struct AssembledRoot {
  std::string labelAttribute;        // the real attribute that carries labels from now on
  std::vector<InodeOrigin> origins;  // which inode came from which tardisk
};

// The part of a boot that acts on files; the policy that is installed stays as it is. Every archive
// in /tardisks is unpacked into the root, in byte order of name; a file that several bring is the
// last one's. Every file of the root file system, the images included, gets its first label,
// "unlabeled". What belongs to the running system (/dev, /proc, /run, /sys) is left alone. Changes
// the working directory while it runs.
// Throws Braxo::Lib::BraxoException for a state that cannot be used, at the first archive that
// cannot be unpacked, naming the entry, or, after all others were labelled, for files that could
// not be; what was done until then stays.
AssembledRoot AssembleRoot();

// The part of a boot that acts on the state: it goes back to the built-in contents with the label
// attribute and the origins of `root`, and no wanted setting counts as applied.
void StartPolicy(const AssembledRoot& root);

// Unpacks the archive `image` into the working directory, which stands for the root, and gives
// what it brings its first label in the real attribute `labelAttribute`. Appends the origin of
// every inode to `origins`, under the name of the image without its directory. Never writes outside
// the working directory: absolute paths, "..", ways through links, hard links to what this archive
// has not brought, device nodes and sockets are refused, and so is what belongs to the running
// system or to the images. Throws Braxo::Lib::BraxoException at the first bad entry; earlier ones
// are kept.
void UnpackTardisk(const std::string& image, const std::string& labelAttribute,
                   std::vector<InodeOrigin>& origins);

}  // namespace LinuxHost
