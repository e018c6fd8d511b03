#include "host/linux/files/file_walk.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <memory>
#include <string_view>
#include <utility>
#include <vector>

#include "host/linux/files/directory_entry.h"

namespace LinuxHost {
namespace {

struct CloseDirectory {
  void operator()(DIR* directory) const { closedir(directory); }
};
using Directory = std::unique_ptr<DIR, CloseDirectory>;

Directory OpenDirectory(const char* name) {
  const int descriptor = open(name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
  Directory directory(descriptor < 0 ? nullptr : fdopendir(descriptor));
  if (!directory && descriptor >= 0) close(descriptor);
  return directory;
}

class Walk {
 public:
  Walk(const std::string& start, const OnFile& onFile, const OnWalkFailure& onFailure)
      : path(start), visit(onFile), fail(onFailure) {}

  void Run(const std::string& start) {
    char resolved[PATH_MAX];
    if (realpath(start.c_str(), resolved) == nullptr) return Fail(errno);
    const bool isWanted = visit({.name = resolved, .path = path, .type = DT_UNKNOWN, .depth = 0});
    if (!isWanted || !Enter(resolved, path.size())) return;
    while (!levels.empty()) {
      if (levels.back().waiting.empty()) {
        Leave();
        continue;
      }
      const Entry entry = std::move(levels.back().waiting.back());
      levels.back().waiting.pop_back();
      ComeTo(entry);
    }
  }

 private:
  struct Entry {
    std::string name;
    unsigned char type;
  };

  // A directory between the start and where the walk is.
  struct Level {
    dev_t device;
    ino_t inode;
    std::size_t pathSize;        // of `path` without the directory
    std::vector<Entry> waiting;  // its entries still to be visited, the next one last
  };

  void Fail(int error) {
    // What has gone below the start is nobody's concern.
    if (error != ENOENT || levels.empty()) fail(path, error);
  }

  void ComeTo(const Entry& entry) {
    const std::size_t pathSize = path.size();
    if (!path.ends_with('/')) path += '/';
    path += entry.name;
    const bool isWanted = visit(
        {.name = entry.name.c_str(), .path = path, .type = entry.type, .depth = levels.size()});
    if (!isWanted || !Enter(entry.name.c_str(), pathSize)) path.resize(pathSize);
  }

  bool Enter(const char* name, std::size_t pathSize) {
    const Directory directory = OpenDirectory(name);
    struct stat entered {};
    if (!directory || fstat(dirfd(directory.get()), &entered) != 0 ||
        fchdir(dirfd(directory.get())) != 0) {
      Fail(errno);
      return false;
    }
    levels.push_back({entered.st_dev, entered.st_ino, pathSize, {}});
    List(directory.get(), levels.back().waiting);
    return true;
  }

  void List(DIR* directory, std::vector<Entry>& entries) {
    errno = 0;
    while (const dirent* entry = readdir(directory)) {
      const std::string_view name = entry->d_name;
      if (name != "." && name != "..") entries.push_back({std::string(name), entry->d_type});
      errno = 0;
    }
    if (errno != 0) Fail(errno);
    std::sort(entries.begin(), entries.end(),
              [](const Entry& one, const Entry& other) { return one.name > other.name; });
  }

  // Back up. A directory that was moved meanwhile has another one above it.
  void Leave() {
    const std::size_t pathSize = levels.back().pathSize;
    levels.pop_back();
    if (levels.empty()) return;
    struct stat status {};
    const bool isBack = chdir("..") == 0 && lstat(".", &status) == 0 &&
                        status.st_dev == levels.back().device &&
                        status.st_ino == levels.back().inode;
    if (!isBack) {
      fail(path, kMoved);
      levels.clear();
    }
    path.resize(pathSize);
  }

  const DirectoryVisit workingDirectory;
  std::string path;  // of where the walk is
  const OnFile& visit;
  const OnWalkFailure& fail;
  std::vector<Level> levels;
};

}  // namespace

void WalkFiles(const std::string& start, const std::string& path, const OnFile& visit,
               const OnWalkFailure& fail) {
  Walk(path, visit, fail).Run(start);
}

}  // namespace LinuxHost
