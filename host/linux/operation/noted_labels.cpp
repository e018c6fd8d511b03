// Labels that are taken down instead of given. A load must not label files before its rules are in
// force, and must know before whether it could, so each label is refused here as it would be there,
// without a trace on the file. Notes are many, one a file, so a note is an entry in two growing
// lists, a directory is kept once, and names lie one behind the other in one text.
#include "host/linux/operation/noted_labels.h"

#include <fcntl.h>
#include <linux/magic.h>
#include <sys/stat.h>
#include <sys/statfs.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <bit>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <optional>
#include <string_view>

#include "host/linux/common/errno_guard.h"
#include "host/linux/common/used_paths.h"
#include "host/linux/files/inherited_label.h"
#include "host/linux/operation/file_label.h"

namespace LinuxHost {
namespace {

int Fail(int error) {
  errno = error;
  return -1;
}

// What would have to be written to is no longer the file itself.
bool IsLink(const std::string& path) {
  const ErrnoGuard guard;
  struct stat status {};
  return lstat(path.c_str(), &status) == 0 && S_ISLNK(status.st_mode);
}

// Tries what passes all checks and then fails with EEXIST or ENODATA, since a file has an attribute
// or has it not. Returns 0 where neither stopped it, and `value` was written.
int TryInVain(const std::string& path, const char* name, const void* value, std::size_t size) {
  constexpr int kNever = XATTR_CREATE | XATTR_REPLACE;
  return lsetxattr(path.c_str(), name, value, size, kNever) == 0 ? 0 : errno;
}

// True of file systems that are known to heed both flags, and to be left as they were by the try.
bool LeavesNoTrace(const std::string& directory) {
  struct statfs status {};
  if (statfs(directory.c_str(), &status) != 0) return false;
  switch (status.f_type) {
    case EXT4_SUPER_MAGIC:
    case TMPFS_MAGIC:
    case XFS_SUPER_MAGIC:
    case BTRFS_SUPER_MAGIC:
      return true;
    default:
      return false;
  }
}

// Whether the process may write the file, which may lie on a read-only file system or be immutable,
// without a try: on some file systems that copies the file.
int CheckQuietly(const std::string& path) {
  if (faccessat(AT_FDCWD, path.c_str(), W_OK, AT_EACCESS) != 0) return -1;
  struct statx status {};
  if (statx(AT_FDCWD, path.c_str(), AT_SYMLINK_NOFOLLOW, STATX_TYPE, &status) != 0) return -1;
  return (status.stx_attributes & STATX_ATTR_APPEND) != 0 ? Fail(EPERM) : 0;
}

int RequireInherited(const std::string& path, const char* name) {
  return ReadInherited(path.c_str(), LastLink::kKept, name, nullptr, 0) < 0 ? -1 : 0;
}

int CheckTracelessly(const std::string& path, const char* name, std::uint32_t id) {
  const int error = TryInVain(path, name, &id, sizeof id);
  if (error == EEXIST) return 0;
  return error == ENODATA ? RequireInherited(path, name) : Fail(error);
}

// The try is with the old value, if the file has one, so that it changes nothing anywhere.
int CheckAnywhere(const std::string& path, const char* name, std::uint32_t id, LabelNotes purpose) {
  auto value = ReadCarried(path.c_str(), name);
  if (!value) {
    const bool mayBeThere = errno == EACCES;
    if (!mayBeThere && (errno != ENODATA || RequireInherited(path, name) != 0)) return -1;
    value.emplace(sizeof id, '\0');
    std::memcpy(value->data(), &id, sizeof id);
  }
  if (purpose == LabelNotes::kDryRun) return CheckQuietly(path);
  const int error = TryInVain(path, name, value->data(), value->size());
  return error == 0 || error == EEXIST || error == ENODATA || error == EINVAL ? 0 : Fail(error);
}

// What lies beside the state, and below.
bool IsOfHost(const std::string& directory) {
  const std::string& state = StatePath();
  return (directory + "/").starts_with(state.substr(0, state.rfind('/') + 1));
}

}  // namespace

NotedLabels::NotedLabels(LabelNotes purposeOfNotes, const std::string& passedOverPath)
    : purpose(purposeOfNotes) {
  const auto split = passedOverPath.empty() ? std::nullopt : SplitPath(passedOverPath);
  if (!split) return;
  passedOverName = split->second;
  passedOver = PlaceOf(passedOverPath).value_or(DirectoryPlace{});
  aboveIt = PlaceOf(split->first).value_or(DirectoryPlace{});
}

// Null, with errno set, when there is no such directory.
const std::uint32_t* NotedLabels::FindDirectory(const std::string& path) {
  // Most files lie where the one before did.
  const auto known = directoryNumbers.find(path);
  if (known != directoryNumbers.end()) return &known->second;
  auto place = PlaceOf(path);
  if (!place) return nullptr;
  const bool isPassedOver = place->IsSame(passedOver);
  const bool holdsPassedOver = place->IsSame(aboveIt);
  directories.push_back({std::move(*place), isPassedOver, holdsPassedOver, LeavesNoTrace(path)});
  const auto number = static_cast<std::uint32_t>(directories.size() - 1);
  return &directoryNumbers.emplace(path, number).first->second;
}

// Files of the notes' owner come and go, so not even their absence is a failure.
bool NotedLabels::IsPassedOver(const Directory& directory, const std::string& name) const {
  return directory.isPassedOver || (directory.holdsPassedOver && name == passedOverName);
}

int NotedLabels::Set(const char* path, const char* name, const void* value, std::size_t size,
                     int flags) {
  std::uint32_t id = 0;
  if (flags != XATTR_REPLACE || size != sizeof id) return Fail(EINVAL);
  std::memcpy(&id, value, sizeof id);
  const auto split = SplitPath(path);
  if (!split) return -1;
  const auto& [directoryPath, entry] = *split;
  const std::uint32_t* number = FindDirectory(directoryPath);
  if (number == nullptr) return -1;
  if (IsPassedOver(directories[*number], entry)) return 0;
  const std::string file = JoinPath(directoryPath, entry);
  const bool isTraceless = directories[*number].leavesNoTrace;
  const int refused =
      isTraceless ? CheckTracelessly(file, name, id) : CheckAnywhere(file, name, id, purpose);
  if (refused != 0) {
    if (!IsLink(file)) return -1;
    char resolved[PATH_MAX];
    if (realpath(file.c_str(), resolved) == nullptr) return -1;
    return IsLink(resolved) ? Fail(ENODATA) : Set(resolved, name, value, size, flags);
  }
  notes.push_back({*number, id});
  names.append(entry).push_back('\0');
  return 0;
}

ssize_t NotedLabels::Get(const char* path, const char* name, void* value, std::size_t size) {
  struct stat status {};
  if (stat(path, &status) != 0) return -1;
  IndexNotes();
  const auto noted = labels.find({status.st_dev, status.st_ino});
  if (noted == labels.end()) {
    const ssize_t result = getxattr(path, name, value, size);
    if (result >= 0 || errno != ENODATA) return result;
    return ReadInherited(path, LastLink::kFollowed, name, value, size);
  }
  const std::uint32_t id = noted->second;
  if (size == 0) return sizeof id;
  if (size < sizeof id) return Fail(ERANGE);
  std::memcpy(value, &id, sizeof id);
  return sizeof id;
}

void NotedLabels::IndexNotes() {
  for (; indexedNotes < notes.size(); ++indexedNotes) {
    const Note& note = notes[indexedNotes];
    const char* name = names.c_str() + indexedNames;
    indexedNames += std::strlen(name) + 1;
    struct stat status {};
    if (lstat(JoinPath(directories[note.directory].place.path, name).c_str(), &status) != 0)
      continue;
    labels[{status.st_dev, status.st_ino}] = note.id;
  }
}

std::vector<LabelChange> NotedLabels::Changes() const {
  std::map<FileId, LabelChange> changes;
  const char* name = names.c_str();
  for (const Note& note : notes) {
    std::string path = JoinPath(directories[note.directory].place.path, name);
    name += std::strlen(name) + 1;
    struct stat status {};
    if (lstat(path.c_str(), &status) != 0) continue;
    const auto [change, isNew] =
        changes.try_emplace({status.st_dev, status.st_ino}, LabelChange{.path = {}});
    change->second.after = note.id;
    if (!isNew) continue;
    change->second.before = ReadLabel(path.c_str()).value_or(FileLabel{}).id;
    change->second.path = std::move(path);
  }
  std::vector<LabelChange> sorted;
  sorted.reserve(changes.size());
  for (auto& [file, change] : changes) sorted.push_back(std::move(change));
  std::sort(sorted.begin(), sorted.end(),
            [](const LabelChange& one, const LabelChange& other) { return one.path < other.path; });
  return sorted;
}

std::vector<LabelFailure> NotedLabels::ForEach(const OnNote& visit) const {
  std::vector<LabelFailure> unreachable;
  DirectoryVisit at;
  const Directory* entered = nullptr;
  int error = 0;
  const std::vector<bool> isFinal = FindFinal();
  const char* name = names.c_str();
  for (std::size_t number = 0; number < notes.size(); name += std::strlen(name) + 1, ++number) {
    if (!isFinal[number]) continue;
    const Note& note = notes[number];
    const Directory& directory = directories[note.directory];
    if (&directory != entered) error = at.Enter(directory.place) ? 0 : errno;
    entered = &directory;
    if (error == 0) {
      visit(directory.place, name, note.id);
    } else {
      unreachable.push_back({JoinPath(directory.place.path, name), error});
    }
  }
  return unreachable;
}

// A file that a policy names twice, with its tree and by itself, must not change its label at each
// load, not even for a moment. The last note about an entry is found first, in a table of numbers
// of notes: a set of names would take as much memory again as all notes.
std::vector<bool> NotedLabels::FindFinal() const {
  constexpr std::uint32_t kFree = 0;
  std::vector<const char*> nameOf(notes.size());
  const char* next = names.c_str();
  for (const char*& name : nameOf) {
    name = next;
    next += std::strlen(next) + 1;
  }
  std::vector<std::uint32_t> table(std::bit_ceil(2 * notes.size() + 1), kFree);
  std::vector<bool> isFinal(notes.size());
  for (std::size_t number = notes.size(); number-- > 0;) {
    const std::size_t directory = notes[number].directory;
    const std::size_t hash = std::hash<std::string_view>()(nameOf[number]) + 31 * directory;
    std::size_t slot = hash & (table.size() - 1);
    const auto isOther = [&](std::uint32_t entry) {
      return notes[entry - 1].directory != directory ||
             std::strcmp(nameOf[entry - 1], nameOf[number]) != 0;
    };
    while (table[slot] != kFree && isOther(table[slot])) slot = (slot + 1) & (table.size() - 1);
    if (table[slot] != kFree) continue;
    table[slot] = static_cast<std::uint32_t>(number + 1);
    isFinal[number] = true;
  }
  return isFinal;
}

std::vector<LabelFailure> NotedLabels::Apply() const {
  std::vector<LabelFailure> failures;
  std::vector<LabelFailure> unreachable =
      ForEach([&](const DirectoryPlace& directory, const char* name, std::uint32_t id) {
        if (ReplaceLabel(name, id) == 0) return;
        const int error = errno;
        // The load itself takes away what tells others of the policy before.
        if (error == ENOENT && IsOfHost(directory.path)) return;
        failures.push_back({JoinPath(directory.path, name), error});
      });
  failures.insert(failures.end(), std::make_move_iterator(unreachable.begin()),
                  std::make_move_iterator(unreachable.end()));
  return failures;
}

}  // namespace LinuxHost
