#include "host/linux/common/private_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

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

// For a look at what is there, which nothing can keep waiting, and which drops no lock when it
// ends.
constexpr int kLookAt = O_PATH | O_NOFOLLOW | O_CLOEXEC;

const char* NameOf(const std::string& path) { return path.c_str() + path.rfind('/') + 1; }

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

// Looks at a link itself, never at what it leads to, and waits for nothing.
struct stat Examine(const Descriptor& file, const std::string& path) {
  struct stat status {};
  if (!file.IsOpen() || fstat(file.Number(), &status) != 0) {
    ThrowErrno("Unable to examine ", path);
  }
  return status;
}

void RequireDirectory(const Descriptor& opened, const std::string& directory, const Use& use) {
  const struct stat status = Examine(opened, directory);
  if (!S_ISDIR(status.st_mode)) {
    throw HostError(ENOTDIR,
                    StrCat("Refusing the ", use.purpose, ": ", directory, " is not a directory"));
  }
  RequirePrivate(status, directory, use);
}

struct stat RequireFile(const Descriptor& directory, const std::string& path, const Use& use) {
  const Descriptor opened(openat(directory.Number(), NameOf(path), kLookAt));
  const struct stat status = Examine(opened, path);
  if (!S_ISREG(status.st_mode)) {
    throw HostError(EINVAL, StrCat("Refusing the ", use.purpose, ": ", path,
                                   " is not a regular file. Remove it", use.alternative));
  }
  RequirePrivate(status, path, use);
  return status;
}

void MakeDirectory(const std::string& directory, const Use& use) {
  if (mkdir(directory.c_str(), S_IRWXU) != 0 && errno != EEXIST) {
    if (errno == ENOENT) ThrowParentMissing(directory, use.purpose);
    ThrowErrno("Unable to create the directory ", directory, " for the ", use.purpose);
  }
}

// Only ever opens a file that it has just created: closing another descriptor of a database in use
// would drop this process's locks on it.
void CreateFile(const Descriptor& directory, const std::string& path, const std::string& purpose) {
  constexpr int kFlags = O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  const Descriptor made(openat(directory.Number(), NameOf(path), kFlags, S_IRUSR | S_IWUSR));
  if (made.IsOpen() || errno == EEXIST) return;
  ThrowErrno("Unable to create the ", purpose, " ", path);
}

bool IsMissing(const Descriptor& directory, const std::string& path) {
  struct stat status {};
  return fstatat(directory.Number(), NameOf(path), &status, AT_SYMLINK_NOFOLLOW) != 0 &&
         errno == ENOENT;
}

std::string DirectoryOf(const std::string& path, const std::string& purpose) {
  RequireFilePath(path, purpose);
  const auto slash = path.rfind('/');
  return slash == 0 ? "/" : path.substr(0, slash);
}

}  // namespace

void RequireFilePath(const std::string& path, const std::string& purpose) {
  if (path.starts_with('/') && !path.ends_with('/')) return;
  throw HostError(
      EINVAL, StrCat("The ", purpose, " needs the absolute path of a file, not \"", path, "\""));
}

struct stat PreparePrivateFile(const std::string& path, const std::string& purpose) {
  const Use use{.purpose = purpose, .alternative = kElsewhere};
  const std::string directory = DirectoryOf(path, purpose);
  MakeDirectory(directory, use);
  const Descriptor opened(open(directory.c_str(), kLookAt));
  RequireDirectory(opened, directory, use);
  if (IsMissing(opened, path)) CreateFile(opened, path, purpose);
  return RequireFile(opened, path, use);
}

struct stat RequirePrivateFile(const std::string& path, const std::string& purpose) {
  const Use use{.purpose = purpose, .alternative = kAnew};
  const std::string directory = DirectoryOf(path, purpose);
  const Descriptor opened(open(directory.c_str(), kLookAt));
  RequireDirectory(opened, directory, use);
  return RequireFile(opened, path, use);
}

void ReplacePrivateFile(const std::string& path, const std::string& text) {
  const std::string fresh = StrCat(path, ".new");
  unlink(fresh.c_str());
  constexpr int kFlags = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  const Descriptor file(open(fresh.c_str(), kFlags, S_IRUSR | S_IWUSR));
  if (!file.IsOpen() || !WriteAll(file.Number(), text) ||
      rename(fresh.c_str(), path.c_str()) != 0) {
    ThrowErrno("Unable to write ", path);
  }
}

}  // namespace LinuxHost
