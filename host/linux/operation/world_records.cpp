// A record counts where its owner is the owner of the process, by all identities of that, and the
// process was started when the record says. Directories of users have names that nobody can take
// before them.
#include "host/linux/operation/world_records.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstdint>
#include <cstdlib>
#include <optional>
#include <sstream>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/process.h"
#include "host/linux/common/shared_directory.h"
#include "host/linux/common/used_paths.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

// What is longer is no record.
constexpr std::size_t kMostBytes = 256;

std::string RecordsPath() {
  const std::string& state = StatePath();
  return StrCat(state.substr(0, state.rfind('/')), "/worlds");
}

// A directory of records, and whose it is.
struct UserDirectory {
  Descriptor opened;
  uid_t owner;
  std::string path;
};

Descriptor OpenIn(const Descriptor& directory, const std::string& name) {
  return Descriptor(openat(directory.Number(), name.c_str(),
                           O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
}

std::optional<UserDirectory> OpenUserDirectory(const Descriptor& records, const std::string& name) {
  Descriptor opened = OpenIn(records, name);
  struct stat status {};
  if (!opened.IsOpen() || fstat(opened.Number(), &status) != 0) return std::nullopt;
  return UserDirectory{.opened = std::move(opened),
                       .owner = status.st_uid,
                       .path = StrCat(RecordsPath(), "/", name)};
}

// 0 for what is none.
int ProcessOf(const std::string& name) {
  int process = 0;
  std::from_chars(name.data(), name.data() + name.size(), process);
  return std::to_string(process) == name ? process : 0;
}

// Empty for what is no file of the directory's owner.
std::string ReadFile(const UserDirectory& directory, const std::string& name) {
  const Descriptor file(openat(directory.opened.Number(), name.c_str(),
                               O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  struct stat status {};
  if (!file.IsOpen() || fstat(file.Number(), &status) != 0) return "";
  if (!S_ISREG(status.st_mode) || status.st_uid != directory.owner) return "";
  std::string content(kMostBytes, '\0');
  const ssize_t count = read(file.Number(), content.data(), content.size());
  content.resize(static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
  return content;
}

// The record of the name, where it is of a process that still is the one that it was made for.
std::optional<WorldRecord> ReadRecord(const UserDirectory& directory, const std::string& name) {
  std::istringstream words(ReadFile(directory, name));
  WorldRecord record{.id = ProcessOf(name), .domain = {}, .level = {}};
  std::int64_t started = 0;
  words >> started >> record.level;
  words.get();
  std::getline(words, record.domain, '\0');
  if (started <= 0 || record.domain.empty() || !IsStill(record.id, started)) return std::nullopt;
  return record;
}

// True for the directory of a process that still is the one that has made it.
bool IsOfLiving(const std::string& directory) {
  std::istringstream words(directory);
  int process = 0;
  std::int64_t started = 0;
  words >> process;
  words.get();
  words >> started;
  return words && IsStill(process, started);
}

void RemoveDirectory(const UserDirectory& own, const std::string& name) {
  const auto directory = OpenIn(own.opened, name);
  if (!directory.IsOpen()) return;
  for (const std::string& file : NamesIn(directory)) unlinkat(directory.Number(), file.c_str(), 0);
  unlinkat(own.opened.Number(), name.c_str(), AT_REMOVEDIR);
}

// Makes room for more: nobody else may remove them.
void RemoveOld(const UserDirectory& own) {
  for (const std::string& name : NamesIn(own.opened)) {
    if (ReadRecord(own, name) || IsOfLiving(name)) continue;
    const bool isDirectory = unlinkat(own.opened.Number(), name.c_str(), 0) != 0 && errno == EISDIR;
    if (isDirectory) RemoveDirectory(own, name);
  }
}

UserDirectory OpenOwnDirectory() {
  const std::string path = RecordsPath();
  const Descriptor records(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  if (!records.IsOpen()) ThrowErrno("Unable to record the domain in ", path);
  const std::string prefix = StrCat(geteuid(), ".");
  for (const std::string& name : NamesIn(records)) {
    if (!name.starts_with(prefix)) continue;
    auto found = OpenUserDirectory(records, name);
    if (found && found->owner == geteuid()) return std::move(*found);
  }
  std::string made = StrCat(path, "/", prefix, "XXXXXX");
  if (mkdtemp(made.data()) == nullptr) ThrowErrno("Unable to record the domain in ", path);
  auto opened = OpenUserDirectory(records, made.substr(made.rfind('/') + 1));
  if (!opened) ThrowErrno("Unable to record the domain in ", made);
  return std::move(*opened);
}

}  // namespace

void MakeWorldRecords() {
  constexpr mode_t kForAll = 01777;
  MakeSharedDirectory(RecordsPath(), kForAll);
}

void RecordWorld(const std::string& domain, const std::string& level) {
  const std::int64_t started = StartOf(getpid());
  if (started == 0) throw HostError(ENOENT, "The domain cannot be recorded without /proc");
  const UserDirectory own = OpenOwnDirectory();
  RemoveOld(own);
  const std::string name = std::to_string(getpid());
  const std::string text = StrCat(started, " ", level, " ", domain);
  // One that this process has made in another domain.
  unlinkat(own.opened.Number(), name.c_str(), 0);
  constexpr int kFlags = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  const Descriptor file(openat(own.opened.Number(), name.c_str(), kFlags, S_IRUSR | S_IWUSR));
  if (file.IsOpen() &&
      write(file.Number(), text.data(), text.size()) == static_cast<ssize_t>(text.size())) {
    return;
  }
  const std::string path = RecordsPath();
  ThrowErrno("Unable to record the domain in ", path);
}

std::string MakeOwnDirectory() {
  std::string path =
      StrCat(OpenOwnDirectory().path, "/", getpid(), ".", StartOf(getpid()), ".XXXXXX");
  if (mkdtemp(path.data()) == nullptr) ThrowErrno("Unable to make ", path);
  return path;
}

std::vector<WorldRecord> ReadWorldRecords() {
  std::vector<WorldRecord> found;
  const Descriptor records(
      open(RecordsPath().c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  if (!records.IsOpen()) return found;
  for (const std::string& user : NamesIn(records)) {
    const auto directory = OpenUserDirectory(records, user);
    if (!directory) continue;
    for (const std::string& name : NamesIn(directory->opened)) {
      auto record = ReadRecord(*directory, name);
      if (!record || OwnerOf(record->id) != directory->owner) continue;
      record->user = directory->owner;
      found.push_back(std::move(*record));
    }
  }
  std::ranges::sort(found, {}, &WorldRecord::id);
  return found;
}

}  // namespace LinuxHost
