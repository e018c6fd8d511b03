#include "host/linux/files/inherited_label.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdint>
#include <cstdlib>
#include <optional>
#include <string>
#include <utility>

#include "host/linux/common/descriptor.h"

namespace LinuxHost {
namespace {

// Newer than the headers that this may be compiled with.
constexpr long kSetXattrAt = 463;
constexpr long kGetXattrAt = 464;

struct XattrArguments {
  alignas(8) std::uint64_t value;
  std::uint32_t size;
  std::uint32_t flags;
};

int Fail(int error) {
  errno = error;
  return -1;
}

int OpenDirectory(int from, const char* path) {
  return openat(from, path, O_PATH | O_DIRECTORY | O_CLOEXEC);
}

// What tells a directory or a file from all others, and where it lies.
std::optional<struct statx> StatusOf(int directory, const char* name) {
  constexpr int kFlags = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT;
  struct statx status {};
  if (statx(directory, name, kFlags, STATX_TYPE | STATX_INO | STATX_MNT_ID, &status) != 0) {
    return std::nullopt;
  }
  return status;
}

bool IsOnSameMount(const struct statx& one, const struct statx& other) {
  return one.stx_dev_major == other.stx_dev_major && one.stx_dev_minor == other.stx_dev_minor &&
         one.stx_mnt_id == other.stx_mnt_id;
}

// A file as an entry of a directory that is held open: whatever is renamed meanwhile, what is done
// to the entry is done right there, and to no link's target.
struct Entry {
  Descriptor directory;
  std::string name;
};

// A kernel without the calls that take an entry, or a sandbox that refuses them.
bool IsCallMissing() { return errno == ENOSYS || errno == EPERM; }

// Opens a file or directory for its attributes; nothing else can be opened without consequences.
int OpenContent(const Entry& entry) {
  const auto status = StatusOf(entry.directory.Number(), entry.name.c_str());
  if (!status) return -1;
  if (!S_ISREG(status->stx_mode) && !S_ISDIR(status->stx_mode)) return Fail(ENODATA);
  return openat(entry.directory.Number(), entry.name.c_str(),
                O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
}

// /proc leads to what must not be opened, too, where there is one.
int SetByProc(const Entry& entry, const char* name, const void* value, std::size_t size) {
  constexpr int kFlags = O_PATH | O_NOFOLLOW | O_CLOEXEC;
  const Descriptor held(openat(entry.directory.Number(), entry.name.c_str(), kFlags));
  struct stat status {};
  if (!held.IsOpen() || fstat(held.Number(), &status) != 0) return -1;
  if (S_ISLNK(status.st_mode)) return Fail(ENODATA);
  const std::string path = "/proc/self/fd/" + std::to_string(held.Number());
  const int result = setxattr(path.c_str(), name, value, size, 0);
  return result != 0 && errno == ENOENT ? Fail(ENODATA) : result;
}

ssize_t GetFrom(const Entry& entry, const char* name, void* value, std::size_t size) {
  const XattrArguments arguments = {.value = reinterpret_cast<std::uintptr_t>(value),
                                    .size = static_cast<std::uint32_t>(size),
                                    .flags = 0};
  const long result = syscall(kGetXattrAt, entry.directory.Number(), entry.name.c_str(),
                              AT_SYMLINK_NOFOLLOW, name, &arguments, sizeof arguments);
  if (result >= 0 || !IsCallMissing()) return result;
  const Descriptor file(OpenContent(entry));
  return file.IsOpen() ? fgetxattr(file.Number(), name, value, size) : -1;
}

int SetOn(const Entry& entry, const char* name, const void* value, std::size_t size) {
  const XattrArguments arguments = {.value = reinterpret_cast<std::uintptr_t>(value),
                                    .size = static_cast<std::uint32_t>(size),
                                    .flags = 0};
  const long result = syscall(kSetXattrAt, entry.directory.Number(), entry.name.c_str(),
                              AT_SYMLINK_NOFOLLOW, name, &arguments, sizeof arguments);
  if (result >= 0 || !IsCallMissing()) return static_cast<int>(result);
  const Descriptor file(OpenContent(entry));
  if (file.IsOpen()) return fsetxattr(file.Number(), name, value, size, 0);
  return errno == ENODATA ? SetByProc(entry, name, value, size) : -1;
}

// The entry that `path` names without a link at its end. A path that ends in a directory by another
// way than its name is that directory's own entry ".".
Entry Hold(const std::string& path) {
  const std::size_t slash = path.rfind('/');
  std::string name = path.substr(slash == std::string::npos ? 0 : slash + 1);
  if (name.empty() || name == "." || name == "..") {
    return {Descriptor(OpenDirectory(AT_FDCWD, path.c_str())), "."};
  }
  const std::string directory = slash == std::string::npos ? "." : path.substr(0, slash + 1);
  return {Descriptor(OpenDirectory(AT_FDCWD, directory.c_str())), std::move(name)};
}

// A file that carries no attribute.
struct Heir {
  Entry entry;
  struct statx status;
};

std::optional<Heir> Find(const std::string& path) {
  Entry entry = Hold(path);
  if (!entry.directory.IsOpen()) return std::nullopt;
  const auto status = StatusOf(entry.directory.Number(), entry.name.c_str());
  if (!status) return std::nullopt;
  return Heir{std::move(entry), *status};
}

std::optional<Heir> FindWithoutLink(const char* path, LastLink lastLink) {
  auto heir = Find(path);
  if (!heir || !S_ISLNK(heir->status.stx_mode)) return heir;
  errno = ENODATA;
  if (lastLink == LastLink::kKept) return std::nullopt;
  char resolved[PATH_MAX];
  if (realpath(path, resolved) == nullptr) return std::nullopt;
  heir = Find(resolved);
  if (!heir || !S_ISLNK(heir->status.stx_mode)) return heir;
  errno = ENODATA;  // planted this very moment
  return std::nullopt;
}

// The attribute of the nearest directory that has it.
ssize_t ReadAbove(const Heir& heir, const char* name, void* value, std::size_t size) {
  const bool isItself = heir.entry.name == ".";
  Entry above{Descriptor(OpenDirectory(heir.entry.directory.Number(), isItself ? ".." : ".")), "."};
  struct statx below = heir.status;
  while (above.directory.IsOpen()) {
    const auto status = StatusOf(above.directory.Number(), ".");
    if (!status) return -1;
    const bool isRoot = status->stx_ino == below.stx_ino;
    if (isRoot || !IsOnSameMount(*status, below)) return Fail(ENODATA);
    const ssize_t result = GetFrom(above, name, value, size);
    if (result >= 0 || errno != ENODATA) return result;
    below = *status;
    above.directory = Descriptor(OpenDirectory(above.directory.Number(), ".."));
  }
  return -1;
}

}  // namespace

ssize_t ReadInherited(const char* path, LastLink lastLink, const char* name, void* value,
                      std::size_t size) {
  const auto heir = FindWithoutLink(path, lastLink);
  return heir ? ReadAbove(*heir, name, value, size) : -1;
}

int ReplaceInherited(const char* path, LastLink lastLink, const char* name, const void* value,
                     std::size_t size) {
  const auto heir = FindWithoutLink(path, lastLink);
  if (!heir || ReadAbove(*heir, name, nullptr, 0) < 0) return -1;
  return SetOn(heir->entry, name, value, size);
}

}  // namespace LinuxHost
