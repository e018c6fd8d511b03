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
#include <map>
#include <optional>
#include <utility>

namespace LinuxHost {
namespace {

// A file has one label, whatever its names.
using FileId = std::pair<dev_t, ino_t>;

struct NotedLabel {
  std::string path;
  std::string before;
  std::string after;
};

bool rehearsing = false;
std::map<FileId, NotedLabel>& Noted() {
  static std::map<FileId, NotedLabel> noted;
  return noted;
}

// Empty with errno set when there is no such file.
std::optional<FileId> IdentityOf(const char* path) {
  struct stat status {};
  if (stat(path, &status) != 0) return std::nullopt;
  return FileId{status.st_dev, status.st_ino};
}

// What the file really carries; empty with errno set when it carries nothing.
std::optional<std::string> ReadReal(const char* path, const char* name) {
  std::array<char, XATTR_SIZE_MAX> value;
  const ssize_t size = getxattr(path, name, value.data(), value.size());
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

void StartLabelRehearsal() { rehearsing = true; }

std::vector<LabelChange> RehearsedLabels() {
  std::vector<LabelChange> changes;
  for (const auto& [file, label] : Noted()) {
    if (label.before == label.after) continue;
    changes.push_back({label.path, Identifier(label.before), Identifier(label.after)});
  }
  std::sort(changes.begin(), changes.end(),
            [](const LabelChange& one, const LabelChange& other) { return one.path < other.path; });
  return changes;
}

bool IsRehearsing() { return rehearsing; }

int RehearseSetting(const char* path, const char* name, const void* value, std::size_t size,
                    int flags) {
  const auto file = IdentityOf(path);
  if (!file) return -1;
  std::string label(static_cast<const char*>(value), size);
  const auto noted = Noted().find(*file);
  const auto real = noted == Noted().end() ? ReadReal(path, name) : noted->second.before;
  if (!real && (errno != ENODATA || flags == XATTR_REPLACE)) return -1;
  if (real && flags == XATTR_CREATE) return Fail(EEXIST);
  // Tells read-only file systems and immutable files too.
  if (faccessat(AT_FDCWD, path, W_OK, AT_EACCESS) != 0) return -1;
  if (noted != Noted().end()) {
    noted->second.after = std::move(label);
  } else {
    Noted().emplace(*file, NotedLabel{path, real.value_or(""), std::move(label)});
  }
  return 0;
}

ssize_t ReadRehearsed(const char* path, const char* name, void* value, std::size_t size) {
  const auto file = IdentityOf(path);
  if (!file) return -1;
  const auto noted = Noted().find(*file);
  if (noted == Noted().end()) return getxattr(path, name, value, size);
  const std::string& label = noted->second.after;
  if (size == 0) return static_cast<ssize_t>(label.size());
  if (size < label.size()) return Fail(ERANGE);
  std::memcpy(value, label.data(), label.size());
  return static_cast<ssize_t>(label.size());
}

}  // namespace LinuxHost
