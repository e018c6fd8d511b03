#include "host/enforce/real_file_tree.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <string_view>

#include "braxo/lib/exception.h"
#include "braxo/misc/strcat.h"
#include "host/enforce/features.h"
#include "host/enforce/supervise/file_descriptor.h"

namespace Enforce {
namespace {

// What a filter of system calls answers to those that it does not know.
bool IsRefusedCall(int error) { return error == ENOSYS || error == EPERM; }

// True where the system refused to look, at whatever it is.
bool IsAboutThisProcess(int error) {
  return IsRefusedCall(error) || error == EMFILE || error == ENFILE || error == ENOMEM;
}

int OpenAtOnce(const std::string& path, int flags) {
  open_how how{};
  how.flags = static_cast<unsigned>(flags);
  how.resolve = RESOLVE_NO_SYMLINKS;
  return static_cast<int>(syscall(SYS_openat2, AT_FDCWD, path.c_str(), &how, sizeof how));
}

// As OpenAtOnce, for processes whose filter of system calls is older than openat2.
int OpenNameByName(std::string_view path, int flags) {
  FileDescriptor directory(open("/", O_PATH | O_CLOEXEC));
  path.remove_prefix(1);
  for (auto slash = path.find('/'); slash != std::string_view::npos; slash = path.find('/')) {
    const std::string name(path.substr(0, slash));
    directory =
        FileDescriptor(openat(directory.Number(), name.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC));
    if (!directory.IsOpen()) return -1;
    path.remove_prefix(slash + 1);
  }
  const std::string last(path.empty() ? "." : path);
  return openat(directory.Number(), last.c_str(), flags);
}

// Opens what is at the path and only there: a link on the way leads nowhere. Throws BraxoException
// where this process cannot look, which does not mean that there is nothing.
int OpenPlainly(const std::string& path, int flags) {
  flags |= O_NOFOLLOW | O_CLOEXEC;
  int file = OpenAtOnce(path, flags);
  if (file < 0 && IsRefusedCall(errno)) file = OpenNameByName(path, flags);
  if (file < 0 && IsAboutThisProcess(errno)) {
    throw Braxo::Lib::BraxoException(
        Braxo::Misc::StrCat("Unable to look for ", path, ": ", std::strerror(errno)));
  }
  return file;
}

FileKind KindOfMode(mode_t mode) {
  if (S_ISDIR(mode)) return FileKind::kDirectory;
  if (S_ISLNK(mode)) return FileKind::kLink;
  return S_ISREG(mode) ? FileKind::kFile : FileKind::kSpecial;
}

struct CloseDirectory {
  void operator()(DIR* directory) const { closedir(directory); }
};

FileKind LookAt(const std::string& path) {
  const int file = OpenPlainly(path, O_PATH);
  if (file < 0) return FileKind::kNothing;
  struct stat status {};
  const bool isThere = fstat(file, &status) == 0;
  close(file);
  return isThere ? KindOfMode(status.st_mode) : FileKind::kNothing;
}

bool IsEntry(const std::string& name) { return name != "." && name != ".."; }

}  // namespace

FileKind RealFileTree::KindOf(const std::string& path) {
  const auto [place, isNew] = known.try_emplace(path, FileKind::kNothing);
  if (isNew) place->second = LookAt(path);
  return place->second;
}

std::optional<std::vector<std::string>> RealFileTree::List(const std::string& directory,
                                                           std::size_t most) {
  const int file = OpenPlainly(directory, O_RDONLY | O_DIRECTORY);
  if (file < 0) return std::nullopt;
  const std::unique_ptr<DIR, CloseDirectory> entries(fdopendir(file));
  if (entries == nullptr) {
    close(file);
    return std::nullopt;
  }
  std::vector<std::string> names;
  while (const dirent* const entry = readdir(entries.get())) {
    if (IsEntry(entry->d_name)) names.emplace_back(entry->d_name);
    if (names.size() > most) return std::nullopt;
  }
  return names;
}

bool RealFileTree::CanMask() {
  if (!canMask) canMask = Enforce::CanMask();
  return *canMask;
}

}  // namespace Enforce
