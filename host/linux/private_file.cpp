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

// What a file is for, and what else there is to do about one that is refused.
struct Use {
  const std::string& purpose;
  const char* alternative;
};

constexpr char kElsewhere[] = ", or choose another place";
constexpr char kAnew[] = ", and make it anew";

void RequirePrivate(const struct stat& status, const std::string& path, const Use& use) {
  if (status.st_uid != geteuid() && status.st_uid != 0) {
    throw HostError(EACCES, StrCat("Refusing the ", use.purpose, ": ", path,
                                   " belongs to another user. Remove it", use.alternative));
  }
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    throw HostError(EACCES, StrCat("Refusing the ", use.purpose, ": other users may write ", path,
                                   ". Take that right from them (chmod go-w)", use.alternative));
  }
}

// Looks at a link itself, never at what it leads to.
struct stat Examine(const std::string& path) {
  struct stat status {};
  if (lstat(path.c_str(), &status) != 0) ThrowSystemError(StrCat("Unable to examine ", path));
  return status;
}

void RequireDirectory(const std::string& directory, const Use& use) {
  const struct stat status = Examine(directory);
  if (!S_ISDIR(status.st_mode)) {
    throw HostError(ENOTDIR,
                    StrCat("Refusing the ", use.purpose, ": ", directory, " is not a directory"));
  }
  RequirePrivate(status, directory, use);
}

void RequireFile(const std::string& path, const Use& use) {
  const struct stat status = Examine(path);
  if (!S_ISREG(status.st_mode)) {
    throw HostError(EINVAL, StrCat("Refusing the ", use.purpose, ": ", path,
                                   " is not a regular file. Remove it", use.alternative));
  }
  RequirePrivate(status, path, use);
}

void PrepareDirectory(const std::string& directory, const Use& use) {
  if (mkdir(directory.c_str(), S_IRWXU) != 0 && errno != EEXIST) {
    if (errno == ENOENT) ThrowParentMissing(directory, use.purpose);
    ThrowSystemError(
        StrCat("Unable to create the directory ", directory, " for the ", use.purpose));
  }
  RequireDirectory(directory, use);
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

bool IsMissing(const std::string& path) {
  struct stat status {};
  return lstat(path.c_str(), &status) != 0 && errno == ENOENT;
}

std::string DirectoryOf(const std::string& path, const std::string& purpose) {
  const auto slash = path.rfind('/');
  if (path.empty() || path.front() != '/' || slash + 1 == path.size()) {
    throw HostError(
        EINVAL, StrCat("The ", purpose, " needs the absolute path of a file, not \"", path, "\""));
  }
  return slash == 0 ? "/" : path.substr(0, slash);
}

}  // namespace

void PreparePrivateFile(const std::string& path, const std::string& purpose) {
  const Use use{.purpose = purpose, .alternative = kElsewhere};
  PrepareDirectory(DirectoryOf(path, purpose), use);
  if (IsMissing(path)) CreateFile(path, purpose);
  RequireFile(path, use);
}

void RequirePrivateFile(const std::string& path, const std::string& purpose) {
  const Use use{.purpose = purpose, .alternative = kAnew};
  RequireDirectory(DirectoryOf(path, purpose), use);
  RequireFile(path, use);
}

}  // namespace LinuxHost
