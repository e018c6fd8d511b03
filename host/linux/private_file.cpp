#include "private_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "braxo/misc/strcat.h"
#include "host_error.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

[[noreturn]] void ThrowSystemError(const std::string& what) {
  const int code = errno;
  throw HostError(code, StrCat(what, ": ", std::strerror(code)));
}

[[noreturn]] void ThrowParentMissing(const std::string& directory, const std::string& purpose) {
  throw HostError(
      ENOENT, StrCat("Unable to create the directory ", directory, " for the ", purpose, ": ",
                     std::strerror(ENOENT), ". Make ", directory.substr(0, directory.rfind('/')),
                     " first, or choose another place"));
}

void RequirePrivate(const struct stat& status, const std::string& path,
                    const std::string& purpose) {
  if (status.st_uid != geteuid() && status.st_uid != 0) {
    throw HostError(EACCES, StrCat("Refusing the ", purpose, ": ", path,
                                   " belongs to another user. Remove it, or choose another place"));
  }
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    throw HostError(EACCES, StrCat("Refusing the ", purpose, ": other users may write ", path,
                                   ". Take that right from them (chmod go-w), or choose another "
                                   "place"));
  }
}

void PrepareDirectory(const std::string& directory, const std::string& purpose) {
  if (mkdir(directory.c_str(), S_IRWXU) != 0 && errno != EEXIST) {
    if (errno == ENOENT) ThrowParentMissing(directory, purpose);
    ThrowSystemError(StrCat("Unable to create the directory ", directory, " for the ", purpose));
  }
  struct stat status {};
  if (lstat(directory.c_str(), &status) != 0) {
    ThrowSystemError(StrCat("Unable to examine ", directory));
  }
  if (!S_ISDIR(status.st_mode)) {
    throw HostError(ENOTDIR,
                    StrCat("Refusing the ", purpose, ": ", directory, " is not a directory"));
  }
  RequirePrivate(status, directory, purpose);
}

// Only ever opens a file that it has just created: closing another descriptor of a database in use
// would drop this process's locks on it.
void CreateFile(const std::string& path, const std::string& purpose) {
  const int descriptor =
      open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR);
  if (descriptor >= 0) {
    close(descriptor);
    return;
  }
  if (errno != EEXIST) ThrowSystemError(StrCat("Unable to create the ", purpose, " ", path));
}

}  // namespace

void PreparePrivateFile(const std::string& path, const std::string& purpose) {
  const auto slash = path.rfind('/');
  if (path.empty() || path.front() != '/' || slash + 1 == path.size()) {
    throw HostError(
        EINVAL, StrCat("The ", purpose, " needs the absolute path of a file, not \"", path, "\""));
  }
  PrepareDirectory(slash == 0 ? "/" : path.substr(0, slash), purpose);

  struct stat status {};
  if (lstat(path.c_str(), &status) != 0) {
    if (errno != ENOENT) ThrowSystemError(StrCat("Unable to examine ", path));
    CreateFile(path, purpose);
    if (lstat(path.c_str(), &status) != 0) ThrowSystemError(StrCat("Unable to examine ", path));
  }
  if (!S_ISREG(status.st_mode)) {
    throw HostError(EINVAL, StrCat("Refusing the ", purpose, ": ", path,
                                   " is not a regular file. Remove it, or choose another place"));
  }
  RequirePrivate(status, path, purpose);
}

}  // namespace LinuxHost
