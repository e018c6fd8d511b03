#pragma once

#include <sys/stat.h>

#include <functional>
#include <string>
#include <vector>

#include "host/linux/files/tardisk_rules.h"

namespace LinuxHost {

// What an archive brings to one path.
struct ArchiveFinding {
  std::string path;  // below the working directory
  mode_t type;       // S_IFREG and so on
  mode_t present;    // the type of what is there now; 0 for nothing
  bool differs;      // what is there was compared, and is something else
};

// Looks on while archives are checked.
class ArchiveInspector {
 public:
  virtual ~ArchiveInspector() = default;

  // The archive of the tardisk `name` is checked from now on.
  virtual void Begin(const std::string& name) = 0;

  // Whether what is at `path` now, which is no directory, is to be compared with what comes there.
  virtual bool WantsComparison(const std::string& path, const struct statx& present) = 0;

  virtual void Take(const ArchiveFinding& finding) = 0;
};

// Reads the archives `images`, which are to be unpacked into the working directory one after the
// other, from their first to their last byte, and changes nothing. Throws HostError at the first
// one that is damaged or holds an entry that is refused, naming the tardisk and what is wrong.
void CheckArchives(const std::vector<std::string>& images, const TardiskRules& rules,
                   ArchiveInspector& inspector);

// Takes what an archive has brought: its path below the working directory, and what statx(2) tells
// about it. Returns 0, or the error number for which the unpacking ends.
using Arrival = std::function<int(const std::string& path, const struct statx& status)>;

// Unpacks the archive `image` into the working directory, and calls `arrived` for each file as soon
// as it is there. Throws HostError as CheckArchives() does; earlier entries are kept.
void UnpackArchive(const std::string& image, const TardiskRules& rules, const Arrival& arrived);

}  // namespace LinuxHost
