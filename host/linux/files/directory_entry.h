#pragma once

#include <sys/types.h>

#include <optional>
#include <string>
#include <utility>

#include "host/linux/common/descriptor.h"

namespace LinuxHost {

// A directory by its path, and which one that was.
struct DirectoryPlace {
  std::string path;
  dev_t device = 0;
  ino_t inode = 0;

  bool IsSame(const DirectoryPlace& other) const {
    return device == other.device && inode == other.inode;
  }
};

// The directory that `path` leads to now. Nothing, with errno set, when there is none.
std::optional<DirectoryPlace> PlaceOf(const std::string& path);

// The directory of a path, and the name in it: "." for the directory itself. A path that ends in a
// directory by another way than its name, such as "/", "a/" and "a/..", is taken apart as its real
// path. Nothing, with errno set, when that leads nowhere.
std::optional<std::pair<std::string, std::string>> SplitPath(const std::string& path);

std::string JoinPath(const std::string& directory, const std::string& name);

// Makes directories the working directory, and returns to the one of before in the end. Who came
// from a directory that is gone stays where this ended.
class DirectoryVisit {
 public:
  DirectoryVisit();
  DirectoryVisit(const DirectoryVisit&) = delete;
  DirectoryVisit& operator=(const DirectoryVisit&) = delete;
  ~DirectoryVisit();

  // False, with errno set, when the directory cannot be entered; ENOENT also when another one is in
  // its place.
  bool Enter(const DirectoryPlace& place);

 private:
  const Descriptor before;
};

}  // namespace LinuxHost
