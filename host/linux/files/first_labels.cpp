#include "host/linux/files/first_labels.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstring>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/running_system.h"
#include "host/linux/files/security_attribute.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

struct CloseDirectory {
  void operator()(DIR* directory) const { closedir(directory); }
};
using Directory = std::unique_ptr<DIR, CloseDirectory>;

// Counts what went wrong and keeps the first of it.
class Failures {
 public:
  void Add(std::string_view path, int error) {
    // A file that has gone needs no label.
    if (error == ENOENT) return;
    if (++count > 1) return;
    firstError = error;
    first = StrCat(path, ": ", std::strerror(error));
  }

  void ThrowIfAny() const {
    if (count == 0) return;
    throw HostError(firstError,
                    StrCat("Unable to give ", count, count == 1 ? " file its" : " files their",
                           " first label: ", first));
  }

 private:
  std::size_t count = 0;
  int firstError = 0;
  std::string first;
};

// Walks by changing directory, one step at a time and never through a link, so that neither a link
// planted on the way nor a tree of any depth leads it astray.
class Walk {
 public:
  // `labelling` labels the file of a name in the working directory: 0, or -1 with errno set.
  Walk(const std::string& name, const std::function<int(const char*)>& labelling)
      : attribute(name), label(labelling) {}

  void Run() {
    struct stat status;
    if (lstat(".", &status) != 0) return failures.Add("/", errno);
    rootDevice = status.st_dev;
    Label(".", status);
    Enter(".");
    while (!levels.empty()) {
      if (levels.back().waiting.empty()) {
        Leave();
        continue;
      }
      const std::string name = std::move(levels.back().waiting.back());
      levels.back().waiting.pop_back();
      Enter(name.c_str());
    }
    failures.ThrowIfAny();
  }

 private:
  // A directory between the root and where the walk is.
  struct Level {
    ino_t inode;
    std::size_t pathSize;              // of `path` without the directory
    std::vector<std::string> waiting;  // its directories that are still to be entered
  };

  void Label(const char* name, const struct stat& status) {
    if (!CanCarryLabel(status.st_mode, attribute) || label(name) == 0) return;
    failures.Add(StrCat(path, "/", name), errno);
  }

  void Enter(const char* name) {
    const Directory directory(OpenDirectory(name));
    struct stat status;
    if (!directory || fstat(dirfd(directory.get()), &status) != 0 ||
        fchdir(dirfd(directory.get())) != 0) {
      return failures.Add(StrCat(path, "/", name), errno);
    }
    levels.push_back({.inode = status.st_ino, .pathSize = path.size(), .waiting = {}});
    if (levels.size() > 1) path.append("/").append(name);
    LabelEntries(directory.get());
  }

  static Directory OpenDirectory(const char* name) {
    const int descriptor = open(name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    return Directory(descriptor < 0 ? nullptr : fdopendir(descriptor));
  }

  void LabelEntries(DIR* directory) {
    errno = 0;
    while (const dirent* entry = readdir(directory)) {
      LabelEntry(entry->d_name);
      errno = 0;
    }
    if (errno != 0) failures.Add(path, errno);
  }

  void LabelEntry(const char* name) {
    if (std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0) return;
    struct stat status;
    if (lstat(name, &status) != 0) return failures.Add(StrCat(path, "/", name), errno);
    const bool isDirectory = S_ISDIR(status.st_mode);
    if (status.st_dev != rootDevice) return;
    if (isDirectory && levels.size() == 1 && IsRunningSystem(name)) return;
    Label(name, status);
    if (isDirectory) levels.back().waiting.emplace_back(name);
  }

  // Back up. A directory that was moved meanwhile has another one above it.
  void Leave() {
    path.resize(levels.back().pathSize);
    levels.pop_back();
    if (levels.empty()) return;
    struct stat status;
    if (chdir("..") == 0 && lstat(".", &status) == 0 && status.st_dev == rootDevice &&
        status.st_ino == levels.back().inode) {
      return;
    }
    throw HostError(EAGAIN, StrCat("Unable to give all files their first label: ", path,
                                   "/ changed meanwhile"));
  }

  const std::string& attribute;
  const std::function<int(const char*)>& label;
  dev_t rootDevice = 0;
  std::string path;  // of where the walk is, without the slash of the root
  std::vector<Level> levels;
  Failures failures;
};

}  // namespace

void GiveFirstLabels(const std::string& attribute) {
  Walk(attribute, [&](const char* name) { return GiveFirstLabel(name, attribute); }).Run();
}

std::size_t CountFirstLabels(const std::string& attribute) {
  std::size_t count = 0;
  Walk(attribute, [&](const char* /*name*/) {
    ++count;
    return 0;
  }).Run();
  return count;
}

}  // namespace LinuxHost
