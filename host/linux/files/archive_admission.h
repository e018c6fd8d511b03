#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

#include "host/linux/files/tardisk_rules.h"

struct archive_entry;

namespace LinuxHost {

// Decides which entries of tardisks may come into the working directory, which stands for the root.
// Remembers what the entries before will have made of it, so that a whole series of archives can be
// judged before the first of them is unpacked.
class ArchiveAdmission {
 public:
  explicit ArchiveAdmission(const TardiskRules& rules);

  // The entries from now on are those of the tardisk `name`.
  void Begin(const std::string& name);

  // True when the entry is to be unpacked, false when what it brings is there already. Throws
  // HostError with the name of the entry and the reason when it is refused.
  bool Admits(archive_entry* entry);

 private:
  enum class Kind { kNothing, kDirectory, kLink, kOther };

  // A directory that tardisks have no business with, as a plain path.
  struct Place {
    std::string path;
    std::string wayTo;  // it or what below it is free: all on this way has to be safe
    const char* reason;
    std::string siblings = {};  // if any, only what has a name that begins so is not free
  };

  // What is there other than a directory once the archives before are unpacked.
  struct Brought {
    std::size_t archive;
    bool isLink;
  };

  void CheckName(const std::string& name) const;
  void CheckSystemPlace(const std::string& name, archive_entry* entry) const;
  void CheckType(const std::string& name, archive_entry* entry) const;
  void CheckHardLink(const std::string& name, const char* target) const;
  void CheckWay(const std::string& name, const std::string& path);
  void CheckProtectedPlaces(const std::string& name, const std::string& path, Kind present,
                            archive_entry* entry) const;
  static bool IsSibling(const Place& place, const std::string& path);
  bool IsFree(const Place& place, const std::string& path) const;
  Kind KindAt(const std::string& path);
  void NoticeAnotherName(const std::string& path, const struct stat& status);
  const Brought* FindBrought(std::string_view target) const;
  void Record(const std::string& path, archive_entry* entry);

  const TardiskRules& rules;
  std::vector<Place> places;
  std::vector<std::pair<dev_t, ino_t>> inodes;  // of `places`, as far as they are there
  std::size_t archive = 0;
  bool mayBringPolicy = false;
  // A directory stays one: nothing else is admitted in its place.
  std::unordered_set<std::string> directories;
  std::unordered_map<std::string, Brought> brought;
};

}  // namespace LinuxHost
