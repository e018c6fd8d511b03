#include "host/linux/files/directory_entry.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdlib>

namespace LinuxHost {

std::optional<DirectoryPlace> PlaceOf(const std::string& path) {
  struct stat status {};
  if (stat(path.c_str(), &status) != 0) return std::nullopt;
  return DirectoryPlace{path, status.st_dev, status.st_ino};
}

std::optional<std::pair<std::string, std::string>> SplitPath(const std::string& path) {
  const std::size_t slash = path.rfind('/');
  std::string name = path.substr(slash == std::string::npos ? 0 : slash + 1);
  if (!name.empty() && name != "." && name != "..") {
    std::string directory = slash == std::string::npos ? "." : path.substr(0, slash);
    return std::pair{directory.empty() ? "/" : std::move(directory), std::move(name)};
  }
  char resolved[PATH_MAX];
  if (realpath(path.c_str(), resolved) == nullptr) return std::nullopt;
  if (std::string(resolved) == "/") return std::pair<std::string, std::string>{"/", "."};
  return SplitPath(resolved);
}

std::string JoinPath(const std::string& directory, const std::string& name) {
  if (name == ".") return directory;
  if (directory == ".") return name;
  return directory.ends_with('/') ? directory + name : directory + "/" + name;
}

DirectoryVisit::DirectoryVisit() : before(open(".", O_PATH | O_DIRECTORY | O_CLOEXEC)) {}

DirectoryVisit::~DirectoryVisit() { [[maybe_unused]] const int result = fchdir(before.Number()); }

bool DirectoryVisit::Enter(const DirectoryPlace& place) {
  const Descriptor directory(
      openat(before.Number(), place.path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  struct stat status {};
  if (!directory.IsOpen() || fstat(directory.Number(), &status) != 0) return false;
  if (status.st_dev != place.device || status.st_ino != place.inode) {
    errno = ENOENT;
    return false;
  }
  return fchdir(directory.Number()) == 0;
}

}  // namespace LinuxHost
