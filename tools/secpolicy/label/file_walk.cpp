#include "file_walk.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <utility>
#include <vector>

#include "host/linux/common/descriptor.h"
#include "secpolicy/parse/directory.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::Descriptor;

bool IsLabelled(unsigned char entryType) {
  switch (entryType) {
    case DT_FIFO:
    case DT_CHR:
    case DT_DIR:
    case DT_BLK:
    case DT_REG:
      return true;
    default:
      return false;
  }
}

// Comes back to the working directory of before. Who came from a directory that is gone stays where
// the walk ended.
class WorkingDirectory {
 public:
  WorkingDirectory() : before(open(".", O_PATH | O_DIRECTORY | O_CLOEXEC)) {}
  WorkingDirectory(const WorkingDirectory&) = delete;
  WorkingDirectory& operator=(const WorkingDirectory&) = delete;
  ~WorkingDirectory() { [[maybe_unused]] const int result = fchdir(before.Number()); }

 private:
  const Descriptor before;
};

class Walk {
 public:
  Walk(const std::string& start, const OnFile& onFile, const OnWalkFailure& onFailure)
      : path(start), visit(onFile), fail(onFailure) {}

  void Run(bool wholeTree) {
    char resolved[PATH_MAX];
    if (realpath(path.c_str(), resolved) == nullptr) return Fail();
    visit({.name = resolved, .path = path});
    if (!wholeTree || !Enter(resolved, path.size())) return;
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
    bool isDirectory;
  };

  // A directory between the start and where the walk is.
  struct Level {
    dev_t device;
    ino_t inode;
    std::size_t pathSize;        // of `path` without the directory
    std::vector<Entry> waiting;  // its entries still to be visited, the next one last
  };

  void Fail() {
    // A directory that has gone below the start is nobody's concern.
    if (errno != ENOENT || levels.empty()) fail(path, std::strerror(errno));
  }

  void ComeTo(const Entry& entry) {
    const std::size_t pathSize = path.size();
    if (!path.ends_with('/')) path += '/';
    path += entry.name;
    visit({.name = entry.name.c_str(), .path = path});
    if (!entry.isDirectory || !Enter(entry.name.c_str(), pathSize)) path.resize(pathSize);
  }

  bool Enter(const char* name, std::size_t pathSize) {
    const Descriptor directory(open(name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    struct stat entered {};
    if (!directory.IsOpen() || fstat(directory.Number(), &entered) != 0 ||
        fchdir(directory.Number()) != 0) {
      Fail();
      return false;
    }
    levels.push_back({entered.st_dev, entered.st_ino, pathSize, {}});
    List(levels.back().waiting);
    return true;
  }

  void List(std::vector<Entry>& entries) {
    SecPolicy::Directory directory(".");
    if (!directory.IsOpen()) return Fail();
    while (const dirent* entry = directory.Next()) {
      if (IsLabelled(entry->d_type)) entries.push_back({entry->d_name, entry->d_type == DT_DIR});
    }
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
      fail(path, "It was moved meanwhile, so the walk ended here");
      levels.clear();
    }
    path.resize(pathSize);
  }

  const WorkingDirectory workingDirectory;
  std::string path;  // of where the walk is
  const OnFile& visit;
  const OnWalkFailure& fail;
  std::vector<Level> levels;
};

}  // namespace

void WalkFiles(const std::string& path, bool wholeTree, const OnFile& visit,
               const OnWalkFailure& fail) {
  Walk(path, visit, fail).Run(wholeTree);
}

}  // namespace SecPolicyCli
