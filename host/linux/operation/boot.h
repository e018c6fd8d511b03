#pragma once

#include <sys/types.h>

#include <cstddef>
#include <functional>
#include <map>
#include <string>
#include <vector>

#include "host/linux/common/inode_origin.h"
#include "host/linux/files/tardisk_archive.h"

namespace LinuxHost {

// A root file system as a boot put it together: what a policy starts on.
struct AssembledRoot {
  std::string labelAttribute;            // the real attribute that carries labels from now on
  std::vector<InodeOrigin> origins;      // which inode came from which tardisk
  std::vector<std::string> editedFiles;  // that had been edited since, and were replaced; by name
};

// What a boot would bring to one path.
struct PlannedFile {
  std::string tardisk;
  mode_t type = 0;        // S_IFREG and so on
  mode_t present = 0;     // the type of what is there now; 0 for nothing
  bool differs = false;   // what is there, and is no directory, is something else
  bool isEdited = false;  // and it is not what a tardisk brought there before
};

struct BootPlan {
  std::vector<std::string> tardisks;  // in the order of unpacking
  std::map<std::string, PlannedFile> files;
  std::size_t labelCount = 0;  // of the files that would get their first label
};

// The part of a boot that acts on files; the policy that is installed stays as it is. Every archive
// in /tardisks is checked to its last byte; then all are unpacked into the root, in byte order of
// name; a file that several bring is the last one's. Every file of the root file system, the images
// included, gets its first label, "unlabeled". What belongs to the running system (/dev, /proc,
// /run, /sys) is left alone. Changes the working directory while it runs. `unpacked` is told when
// all is unpacked, if there was anything.
// Throws Braxo::Lib::BraxoException for a state that cannot be used and for the first archive that
// is damaged or refused, and has changed no file then; or when an entry cannot be written; or,
// after all others were labelled, for files that could not be; what was done until then stays.
AssembledRoot AssembleRoot(
    const TardiskRules& rules, const std::function<void()>& unpacked = [] {});

// The part of a boot that acts on the state: it goes back to the built-in contents with the label
// attribute and the origins of `root`, and no wanted setting counts as applied.
void StartPolicy(const AssembledRoot& root);

// What AssembleRoot() would do. Throws as that does, and changes nothing.
BootPlan PlanBoot(const TardiskRules& rules);

// Checks the archives `images`, and when all are well unpacks them into the working directory,
// which stands for the root, and gives what they bring its first label in root.labelAttribute. Adds
// the origin of every inode, under the name of the image without its directory, and the files that
// had been edited to `root`. Never writes outside the working directory: absolute paths, "..", ways
// through links, hard links to what an archive has not brought, device nodes and sockets are
// refused, and so is what belongs to the running system, the images, the policy or the saved
// states. Throws Braxo::Lib::BraxoException before the first file is written.
void UnpackTardisks(const std::vector<std::string>& images, const TardiskRules& rules,
                    AssembledRoot& root);

}  // namespace LinuxHost
