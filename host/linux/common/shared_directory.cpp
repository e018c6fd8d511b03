#include "host/linux/common/shared_directory.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <memory>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/used_paths.h"

namespace LinuxHost {
namespace {

struct CloseDirectory {
  void operator()(DIR* directory) const { closedir(directory); }
};

// Who has chosen another place has chosen who may pass there, too.
void OpenUpUsualPlace(const std::string& directory) {
  constexpr mode_t kPassable = 0711;
  if (!IsStateAtUsualPlace()) return;
  if (chmod(directory.c_str(), kPassable) != 0) ThrowErrno("Unable to open up ", directory);
}

}  // namespace

Descriptor MakeSharedDirectory(const std::string& path, mode_t mode) {
  OpenUpUsualPlace(path.substr(0, path.rfind('/')));
  if (mkdir(path.c_str(), S_IRWXU) != 0 && errno != EEXIST) ThrowErrno("Unable to make ", path);
  Descriptor made(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  struct stat status {};
  if (!made.IsOpen() || fstat(made.Number(), &status) != 0) ThrowErrno("Unable to use ", path);
  if (status.st_uid != geteuid()) {
    throw HostError(EACCES, Braxo::Misc::StrCat("Unable to use ", path,
                                                ": it belongs to another user. Remove it"));
  }
  // Whatever mask this process has.
  if (fchmod(made.Number(), mode) != 0) ThrowErrno("Unable to open up ", path);
  return made;
}

std::vector<std::string> NamesIn(const Descriptor& directory) {
  const int again = openat(directory.Number(), ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (again < 0) return {};
  const std::unique_ptr<DIR, CloseDirectory> listed(fdopendir(again));
  if (!listed) return {};
  std::vector<std::string> names;
  while (const dirent* const entry = readdir(listed.get())) {
    const std::string name = entry->d_name;
    if (name != "." && name != "..") names.push_back(name);
  }
  return names;
}

}  // namespace LinuxHost
