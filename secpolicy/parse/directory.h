#pragma once

#include <dirent.h>

#include <cstring>
#include <memory>
#include <string>

namespace SecPolicy {

// The entries of a directory, in the order in which the operating system lists them.
class Directory {
 public:
  // Opens `path`. A failure shows in IsOpen() and errno.
  explicit Directory(const std::string& path) : stream(opendir(path.c_str())) {}

  bool IsOpen() const { return stream != nullptr; }

  // Returns the next entry but "." and "..", valid until the next call; null after the last one.
  // Only for an open directory.
  const dirent* Next() {
    const dirent* entry = readdir(stream.get());
    while (entry != nullptr && IsSelfOrParent(*entry)) entry = readdir(stream.get());
    return entry;
  }

 private:
  struct Close {
    void operator()(DIR* directory) const { closedir(directory); }
  };

  static bool IsSelfOrParent(const dirent& entry) {
    return std::strcmp(entry.d_name, ".") == 0 || std::strcmp(entry.d_name, "..") == 0;
  }

  std::unique_ptr<DIR, Close> stream;
};

}  // namespace SecPolicy
