#pragma once

#include <string>
#include <vector>

#include "inode_origin.h"

namespace LinuxHost {

// Assembles the root file system as a boot does. The state goes back to the built-in contents, and
// no wanted setting counts as applied. Every archive in /tardisks is unpacked into the root, in
// byte order of name; a file that several bring is the last one's. Which inode came from which
// tardisk is recorded, and every file of the root file system, the images included, gets its first
// label, "unlabeled". What belongs to the running system (/dev, /proc, /run, /sys) is left alone.
// May be called again at any time; changes the working directory while it runs.
// Throws Braxo::Lib::BraxoException at the first archive that cannot be unpacked, naming the entry,
// or, after all others were labelled, for files that could not be; what was done until then stays.
void Boot();

// Unpacks the archive `image` into the working directory, which stands for the root, and gives
// what it brings its first label, `unlabeled`. Appends the origin of every inode to `origins`,
// under the name of the image without its directory. Never writes outside the working directory:
// absolute paths, "..", ways through links, hard links to what this archive has not brought,
// device nodes and sockets are refused, and so is what belongs to the running system or to the
// images. Throws Braxo::Lib::BraxoException at the first bad entry; earlier ones are kept.
void UnpackTardisk(const std::string& image, unsigned int unlabeled,
                   std::vector<InodeOrigin>& origins);

}  // namespace LinuxHost
