#include "label_rehearsal.h"

#include <fcntl.h>
#include <linux/limits.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <map>
#include <optional>
#include <utility>

#include "inherited_label.h"

namespace LinuxHost {
namespace {

// A file has one label, whatever its names.
using FileId = std::pair<dev_t, ino_t>;

bool rehearsing = false;
std::optional<FileId> passedOverDirectory;

std::map<FileId, LabelChange>& Noted() {
  static std::map<FileId, LabelChange> noted;
  return noted;
}

// Empty with errno set when there is no such file.
std::optional<FileId> IdentityOf(const char* path) {
  struct stat status {};
  if (stat(path, &status) != 0) return std::nullopt;
  return FileId{status.st_dev, status.st_ino};
}

bool IsPassedOver(const char* path) {
  if (!passedOverDirectory) return false;
  const std::string directory = std::filesystem::path(path).parent_path();
  return IdentityOf(directory.c_str()) == passedOverDirectory ||
         IdentityOf(path) == passedOverDirectory;
}

// What the file really carries or inherits; empty with errno set when that is nothing.
std::optional<std::string> ReadReal(const char* path, const char* name) {
  std::array<char, XATTR_SIZE_MAX> value;
  ssize_t size = getxattr(path, name, value.data(), value.size());
  if (size < 0 && errno == ENODATA) {
    size = ReadInherited(path, LastLink::kFollowed, name, value.data(), value.size());
  }
  if (size < 0) return std::nullopt;
  return std::string(value.data(), static_cast<std::size_t>(size));
}

std::uint32_t Identifier(const std::string& value) {
  std::uint32_t id = 0;
  if (value.size() == sizeof id) std::memcpy(&id, value.data(), sizeof id);
  return id;
}

int Fail(int error) {
  errno = error;
  return -1;
}

}  // namespace

void StartLabelRehearsal(const std::string& passedOver) {
  rehearsing = true;
  if (!passedOver.empty()) passedOverDirectory = IdentityOf(passedOver.c_str());
}

std::vector<LabelChange> RehearsedLabels() {
  std::vector<LabelChange> changes;
  changes.reserve(Noted().size());
  for (const auto& [file, change] : Noted()) changes.push_back(change);
  std::sort(changes.begin(), changes.end(),
            [](const LabelChange& one, const LabelChange& other) { return one.path < other.path; });
  return changes;
}

bool IsRehearsing() { return rehearsing; }

int RehearseSetting(const char* path, const char* name, const void* value, std::size_t size,
                    int flags) {
  // Its files come and go, so not even their absence is a failure.
  if (IsPassedOver(path)) return 0;
  const auto file = IdentityOf(path);
  if (!file) return -1;
  std::uint32_t id = 0;
  if (size != sizeof id) return Fail(EINVAL);
  std::memcpy(&id, value, sizeof id);
  const auto noted = Noted().find(*file);
  const bool isNoted = noted != Noted().end();
  const auto real = isNoted ? std::nullopt : ReadReal(path, name);
  const bool isLabelled = isNoted || real;
  if (!isLabelled && (errno != ENODATA || flags == XATTR_REPLACE)) return -1;
  if (isLabelled && flags == XATTR_CREATE) return Fail(EEXIST);
  // Tells read-only file systems and immutable files too.
  if (faccessat(AT_FDCWD, path, W_OK, AT_EACCESS) != 0) return -1;
  if (isNoted) {
    noted->second.after = id;
  } else {
    Noted().emplace(*file, LabelChange{path, Identifier(real.value_or("")), id});
  }
  return 0;
}

ssize_t ReadRehearsed(const char* path, const char* name, void* value, std::size_t size) {
  const auto file = IdentityOf(path);
  if (!file) return -1;
  const auto noted = Noted().find(*file);
  if (noted == Noted().end()) {
    const ssize_t result = getxattr(path, name, value, size);
    if (result >= 0 || errno != ENODATA) return result;
    return ReadInherited(path, LastLink::kFollowed, name, value, size);
  }
  const std::uint32_t id = noted->second.after;
  if (size == 0) return sizeof id;
  if (size < sizeof id) return Fail(ERANGE);
  std::memcpy(value, &id, sizeof id);
  return sizeof id;
}

}  // namespace LinuxHost
